#include "tools/manual/mdoc.h"

#include <cctype>
#include <fstream>
#include <iterator>
#include <sstream>
#include <stdexcept>
#include <utility>

namespace manual {
namespace {

/// Of text in the source of a page; what is escaped may be a little longer.
constexpr std::size_t kLineLength = 70;

char capital(char letter) {
    return static_cast<char>(std::toupper(static_cast<unsigned char>(letter)));
}

/// The filled line with its end.
std::string filledLine(const std::string& line, const Fillings& fillings,
                       const std::string& place) {
    std::string result;
    std::size_t from = 0;
    for (std::size_t at = line.find('@'); at != std::string::npos; at = line.find('@', from)) {
        const std::size_t end = line.find('@', at + 1);
        const auto filling = end == std::string::npos
                                 ? fillings.end()
                                 : fillings.find(line.substr(at + 1, end - at - 1));
        if (filling == fillings.end()) throw std::runtime_error(place + ": what is " + line + "?");
        result += line.substr(from, at - from) + filling->second;
        from = end + 1;
    }
    result += line.substr(from);
    if (result.empty() && !line.empty()) return {};
    return !result.empty() && result.back() == '\n' ? result : result + '\n';
}

}  // namespace

std::string escaped(const std::string& text) {
    std::string result;
    for (const char letter : text) {
        const bool beginsLine = result.empty() || result.back() == '\n';
        if (beginsLine && (letter == '.' || letter == '\'')) result += "\\&";
        if (letter == '\\') {
            result += "\\e";
        } else if (letter == '-') {
            result += "\\-";
        } else {
            result += letter;
        }
    }
    return result;
}

std::string sentences(const std::string& text) {
    std::istringstream words(text);
    std::string lines, line;
    for (std::string word; words >> word;) {
        if (lines.empty() && line.empty()) word.front() = capital(word.front());
        if (!line.empty() && line.size() + 1 + word.size() > kLineLength) {
            lines += escaped(std::exchange(line, {})) + '\n';
        }
        line += (line.empty() ? "" : " ") + word;
        if (word.back() == '.') lines += escaped(std::exchange(line, {})) + '\n';
    }
    if (!line.empty()) lines += escaped(line) + ".\n";
    return lines;
}

std::string entry(const std::string& macros, const std::string& text) {
    return ".It " + macros + '\n' + sentences(text);
}

std::string filled(const std::string& templateFile, const Fillings& fillings) {
    std::ifstream in(templateFile);
    if (!in) throw std::runtime_error(templateFile + " cannot be read");
    std::string page;
    for (std::string line; std::getline(in, line);)
        page += filledLine(line, fillings, templateFile);
    return page;
}

std::string contentIfThere(const std::string& file) {
    std::ifstream in(file);
    return {std::istreambuf_iterator<char>(in), {}};
}

void write(const std::string& file, const std::string& text) {
    std::ofstream out(file);
    out << text;
    out.close();
    if (!out.good()) throw std::runtime_error(file + " cannot be written");
}

}  // namespace manual
