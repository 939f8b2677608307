#include "request/turns.h"

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <fstream>
#include <numeric>
#include <random>
#include <sstream>
#include <stdexcept>

namespace request {
namespace {

std::vector<std::string> splitAtBlanks(const std::string& line) {
    std::istringstream in(line);
    std::vector<std::string> words;
    for (std::string word; in >> word;)
        words.push_back(word);
    return words;
}

void take(Way& way) {
    const auto start = std::chrono::steady_clock::now();
    const std::string answer = way.exchange();
    const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - start;
    if (answer.find(way.expected) == std::string::npos) {
        throw std::runtime_error("a wrong answer of " + way.name + ": " + answer);
    }
    way.seconds.push_back(taken.count());
}

double median(std::vector<double>& values) {
    const auto middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
    std::nth_element(values.begin(), middle, values.end());
    return *middle;
}

}  // namespace

Way programOf(const std::string& named, const std::string& expected) {
    const std::size_t equals = named.find('=');
    const std::vector<std::string> words =
        splitAtBlanks(equals == std::string::npos ? "" : named.substr(equals + 1));
    if (words.empty()) throw std::runtime_error("not NAME=COMMAND: " + named);
    return {named.substr(0, equals), program(words), expected};
}

void takeTurns(std::vector<Way>& ways, int rounds) {
    std::mt19937 random;
    std::vector<std::size_t> order(ways.size());
    std::iota(order.begin(), order.end(), 0);
    for (int round = 0; round < rounds; ++round) {
        std::shuffle(order.begin(), order.end(), random);
        for (const std::size_t at : order)
            take(ways[at]);
    }
}

void report(std::vector<Way>& ways, const std::string& prefix, const std::string& out) {
    std::ofstream file;
    if (!out.empty()) file.open(out, std::ios::app);
    for (Way& way : ways) {
        const double seconds = median(way.seconds);
        std::printf("%-22s %10.1f us\n", way.name.c_str(), seconds * 1e6);
        file << prefix << way.name << '\t' << seconds << '\n';
    }
}

}  // namespace request
