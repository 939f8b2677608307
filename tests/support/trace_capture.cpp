#include "support/trace_capture.h"

#include <cstdio>
#include <sstream>

#include "embedded/ras1_control.h"

namespace {

std::string unescaped(const std::string& text) {
    std::string out;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] != '\\' || i + 1 == text.size()) {
            out += text[i];
            continue;
        }
        ++i;
        out += text[i] == 'n' ? '\n' : text[i] == 'r' ? '\r' : text[i];
    }
    return out;
}

/// "2026-01-31 12:34:56.123456 4711 E unit:123 function: text"
TraceLine parseLine(const std::string& line) {
    TraceLine parsed;
    std::istringstream in(line);
    std::string date, time, thread, place, function;
    in >> date >> time >> thread >> parsed.level >> place >> function;
    const std::size_t colon = place.find(':');
    parsed.unit = place.substr(0, colon);
    parsed.line = std::atoi(place.c_str() + colon + 1);
    parsed.function = function.substr(0, function.size() - 1);
    std::string rest;
    std::getline(in, rest, '\0');
    parsed.text = unescaped(rest.empty() ? rest : rest.substr(1));
    return parsed;
}

}  // namespace

TraceCapture::TraceCapture(const std::string& selection) {
    ras1::configure(selection, scratch_.path("trace.log"));
    ras1::showSecrets(true);  // texts are compared as they were traced
}

TraceCapture::~TraceCapture() {
    ras1::showSecrets(false);
    ras1::configureFromEnvironment();
}

std::vector<TraceLine> TraceCapture::lines() const {
    std::vector<TraceLine> found;
    std::istringstream in(scratch_.read("trace.log"));
    for (std::string line; std::getline(in, line);)
        found.push_back(parseLine(line));
    return found;
}

std::vector<std::string> TraceCapture::texts(char level, const std::string& unit) const {
    std::vector<std::string> found;
    for (const TraceLine& line : lines()) {
        if (line.level == level && (unit.empty() || line.unit == unit)) found.push_back(line.text);
    }
    return found;
}

std::vector<std::string> TraceCapture::errors(const std::string& unit) const {
    return texts('E', unit);
}

std::vector<std::string> TraceCapture::details(const std::string& unit) const {
    return texts('D', unit);
}

int TraceCapture::count(char level, const std::string& text) const {
    int found = 0;
    for (const std::string& candidate : texts(level, ""))
        found += candidate == text ? 1 : 0;
    return found;
}

void TraceCapture::clear() {
    std::remove(scratch_.path("trace.log").c_str());
    ras1::configure("ALL", scratch_.path("trace.log"));
}
