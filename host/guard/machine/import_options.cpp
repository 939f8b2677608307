#include "host/guard/machine/import_options.h"

#include <strings.h>

#include <algorithm>
#include <cctype>
#include <charconv>

namespace host {
namespace {

/// The parts between separators; empty ones count when `keepEmpty`.
std::vector<std::string> split(const std::string& text, char separator, bool keepEmpty) {
    std::vector<std::string> parts;
    for (std::size_t begin = 0; begin <= text.size();) {
        const std::size_t end = std::min(text.find(separator, begin), text.size());
        if (keepEmpty || end > begin) parts.push_back(text.substr(begin, end - begin));
        begin = end + 1;
    }
    return parts;
}

std::string inUpperCase(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
    return text;
}

bool endsWith(const std::string& text, const std::string& end) {
    return text.size() >= end.size() &&
           text.compare(text.size() - end.size(), end.size(), end) == 0;
}

}  // namespace

std::vector<std::string> portsIn(const std::string& context) {
    std::string text = inUpperCase(context);
    text.erase(text.find_last_not_of(" \t\n\v\f\r") + 1);
    std::vector<std::string> ports;
    for (const std::string& option : split(text, ',', false)) {
        if (option.find("PORT=") == std::string::npos) continue;
        const std::string value = option.substr(option.find('=') + 1);
        if (!value.empty()) ports.push_back(value);
    }
    return ports;
}

int portNumber(const std::string& text) {
    constexpr int kHighest = 65535;
    int number = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    return error == std::errc() && stop == end && number >= 1 && number <= kHighest ? number : 0;
}

std::string holderOfPort(const std::string& parameters, int port, const std::string& instance) {
    for (const std::string& line : split(parameters, '\n', false)) {
        // INSTANCE|NAME|VALUE|
        const std::vector<std::string> fields = split(line, '|', true);
        if (fields.size() < 3 || !endsWith(fields[1], "PORT")) continue;
        if (portNumber(fields[2]) != port) continue;
        if (::strcasecmp(fields[0].c_str(), instance.c_str()) == 0) continue;
        return fields[0].empty() ? "the default instance" : "instance " + fields[0];
    }
    return "";
}

}  // namespace host
