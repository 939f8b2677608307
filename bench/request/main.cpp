// Times requests to the host beside those to other programs that run a command when asked, all of
// which run the same script. They take turns, so that whatever else the machine does meets all of
// them alike. See request_bench.sh, which starts the servers.
//
//   request_bench --host SOCKET [--nrpe PORT] [--zabbix PORT] [--program NAME=COMMAND-LINE]...
//                 --script PATH --expect TEXT [--rounds N] [--out FILE]
//
// TEXT is what the script prints, or a part of it; every answer of a command must hold it. A
// command line is split at blanks. The medians are printed in microseconds; FILE takes them in
// seconds.

#include <CLI/CLI.hpp>
#include <algorithm>
#include <chrono>
#include <cstdio>
#include <fstream>
#include <iostream>
#include <numeric>
#include <random>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

#include "request/clients.h"

namespace {

using request::Exchange;

struct Way {
    std::string name;
    Exchange exchange;
    std::string expected;  ///< what every answer holds
    std::vector<double> seconds{};
};

struct Options {
    std::string host;
    std::uint16_t nrpe = 0;
    std::uint16_t zabbix = 0;
    std::vector<std::string> programs;
    std::string script;
    std::string expected;
    int rounds = 100;
    std::string out;
};

std::string requestQuery(const std::string& command) {
    return R"({"table": "KAGREQT", "where": [{"column": "COMMAND", "op": "=", "value": ")" +
           command +
           R"("}, {"column": "PRODUCT", "op": "=", "value": "ax"},)"
           R"( {"column": "TRANSID", "op": "=", "value": "bench"}]})";
}

std::vector<std::string> splitAtBlanks(const std::string& line) {
    std::istringstream in(line);
    std::vector<std::string> words;
    for (std::string word; in >> word;)
        words.push_back(word);
    return words;
}

std::vector<Way> waysOf(const Options& options) {
    std::vector<Way> ways;
    for (const bool keep : {true, false}) {
        const std::string suffix = keep ? "/kept" : "/anew";
        ways.push_back({"host/getconfig" + suffix,
                        request::hostQuery(options.host, requestQuery("GETCONFIG"), keep),
                        options.expected});
        ways.push_back({"host/inventory" + suffix,
                        request::hostQuery(options.host, R"({"table": "KINAGT"})", keep),
                        options.expected});
        ways.push_back({"host/refused" + suffix,
                        request::hostQuery(options.host, requestQuery("NOSUCH"), keep),
                        "ZAV1006E"});
    }
    if (options.nrpe != 0)
        ways.push_back({"nrpe", request::nrpe(options.nrpe, "script"), options.expected});
    if (options.zabbix != 0) {
        ways.push_back(
            {"zabbix", request::zabbix(options.zabbix, options.script), options.expected});
    }
    for (const std::string& named : options.programs) {
        const std::size_t equals = named.find('=');
        if (equals == std::string::npos) throw std::runtime_error("not NAME=COMMAND: " + named);
        ways.push_back({named.substr(0, equals),
                        request::program(splitAtBlanks(named.substr(equals + 1))),
                        options.expected});
    }
    return ways;
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

void report(std::vector<Way>& ways, const std::string& out) {
    std::ofstream file;
    if (!out.empty()) file.open(out, std::ios::app);
    for (Way& way : ways) {
        const double seconds = median(way.seconds);
        std::printf("%-22s %10.1f us\n", way.name.c_str(), seconds * 1e6);
        file << "request/" << way.name << '\t' << seconds << '\n';
    }
}

}  // namespace

int main(int argc, char** argv) {
    Options options;
    CLI::App app;
    app.add_option("--host", options.host)->required();
    app.add_option("--nrpe", options.nrpe);
    app.add_option("--zabbix", options.zabbix);
    app.add_option("--program", options.programs);
    app.add_option("--script", options.script)->required();
    app.add_option("--expect", options.expected)->required();
    app.add_option("--rounds", options.rounds)->check(CLI::PositiveNumber);
    app.add_option("--out", options.out);
    CLI11_PARSE(app, argc, argv);
    try {
        std::vector<Way> ways = waysOf(options);
        // In another order each time: what a way leaves behind, cold caches for one, is then borne
        // by all the others alike.
        std::mt19937 random;
        std::vector<std::size_t> order(ways.size());
        std::iota(order.begin(), order.end(), 0);
        for (int round = 0; round < options.rounds; ++round) {
            std::shuffle(order.begin(), order.end(), random);
            for (const std::size_t at : order)
                take(ways[at]);
        }
        report(ways, options.out);
    } catch (const std::exception& error) {
        std::cerr << "request_bench: " << error.what() << '\n';
        return 1;
    }
    return 0;
}
