#include "ctl/show/tasks/command_report.h"

#include <cstdint>
#include <nlohmann/json.hpp>

#include "ctl/client/row.h"
#include "ctl/show/printable.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr std::size_t kMostLines = 10;

/// The last lines of a text without its last line end.
std::string lastLines(std::string text) {
    while (!text.empty() && (text.back() == '\n' || text.back() == '\r'))
        text.pop_back();
    std::size_t start = text.size();
    for (std::size_t lines = 0; lines < kMostLines && start != std::string::npos; ++lines)
        start = start == 0 ? std::string::npos : text.rfind('\n', start - 1);
    return start == std::string::npos ? text : text.substr(start + 1);
}

/// A heading and the lines below it; nothing if there are none.
std::string section(const std::string& heading, const std::string& output) {
    const std::string lines = lastLines(output);
    if (lines.empty()) return {};
    std::string text = "  " + heading + ":\n";
    for (std::size_t start = 0; start <= lines.size();) {
        const std::size_t end = std::min(lines.find('\n', start), lines.size());
        std::string line = lines.substr(start, end - start);
        if (!line.empty() && line.back() == '\r') line.pop_back();
        text += "    " + redacted(line) + "\n";
        start = end + 1;
    }
    return text;
}

constexpr std::int64_t kMostExit = 255;
constexpr std::int64_t kMostSignal = 64;

/// What the host says of an end, and that it makes no sense if no system could have said so.
std::string numberText(const std::string& what, const json& command, const std::string& member,
                       std::int64_t least, std::int64_t most) {
    const std::string text = what + printable(textOf(command, member));
    return isBetween(command, member, least, most) ? text : text + ", which makes no sense";
}

}  // namespace

json commandsOf(const json& record) {
    const auto details = record.find("details");
    if (details == record.end()) return json::array();
    const auto commands = details->find("commands");
    return commands != details->end() && commands->is_array() ? *commands : json::array();
}

std::string endText(const json& command) {
    if (const std::string error = textOf(command, "error"); !error.empty()) {
        return "could not be run: " + redacted(error);
    }
    if (const std::string signal = textOf(command, "signal"); !signal.empty()) {
        const bool isLate = command.value("timed_out", json()) == json(true);
        return (isLate ? "given up after its time-out, " : "") +
               numberText("killed by signal ", command, "signal", 1, kMostSignal);
    }
    if (const std::string code = textOf(command, "exit"); !code.empty()) {
        return numberText("exit code ", command, "exit", 0, kMostExit);
    }
    return "not known";
}

bool diedUnnoticed(const json& command) {
    return !textOf(command, "error").empty() || !textOf(command, "signal").empty();
}

bool endedBadly(const json& command) {
    const bool isGood = textOf(command, "exit").empty() || isBetween(command, "exit", 0, 0);
    return diedUnnoticed(command) || !isGood;
}

std::string commandReport(const json& command) {
    return "  command: " + redacted(textOf(command, "command")) +
           "\n  end:     " + endText(command) + "\n" +
           section("standard output", textOf(command, "stdout")) +
           section("standard error", textOf(command, "stderr"));
}

std::string failureReport(const json& commands) {
    std::string text;
    for (const json& command : commands) {
        if (endedBadly(command)) text += commandReport(command);
    }
    if (!text.empty() || commands.empty()) return text;
    return commandReport(commands.back());
}

}  // namespace ctl
