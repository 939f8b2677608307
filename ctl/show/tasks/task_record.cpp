#include "ctl/show/tasks/task_record.h"

#include <cstdint>
#include <nlohmann/json.hpp>

#include "ctl/client/row.h"
#include "ctl/show/message_catalogue.h"
#include "ctl/show/printable.h"
#include "ctl/show/tasks/command_report.h"
#include "ctl/show/tasks/task_page.h"

using nlohmann::json;

namespace ctl {
namespace {

/// "deploy-7: INSTALL ux 6.3": the transaction identifier, or that of the host without one.
std::string headOf(const json& record) {
    std::string name = textOf(record, "transid");
    if (name.empty()) name = textOf(record, "id");
    std::string text = name + ": " + textOf(record, "command");
    for (const char* const part : {"product", "version", "targetmsn"}) {
        const std::string value = textOf(record, part);
        if (!value.empty()) text += " " + value;
    }
    return printable(text);
}

std::string timeLine(const char* name, const std::string& time, WallTime now) {
    return time.empty() ? std::string() : std::string("  ") + name + timeText(time, now) + "\n";
}

/// The row with the task's result: its last outcome, else the reply.
json resultOf(const json& record) {
    const auto events = record.find("events");
    if (events != record.end() && events->is_array() && !events->empty()) return events->back();
    const auto reply = record.find("reply");
    return reply != record.end() ? *reply : json();
}

/// The process's number, as long as it can be one: it is there to be given to other programs.
std::string processText(const json& command) {
    constexpr std::int64_t kMost = 1 << 22;  // no Linux has a larger one
    if (isBetween(command, "pid", 1, kMost)) return textOf(command, "pid");
    return textOf(command, "pid").empty() ? "-" : "(no process number)";
}

std::string processLine(const json& command, WallTime now) {
    return "  " + processText(command) + "  " + redacted(textOf(command, "command")) + " (" +
           timeText(textOf(command, "started"), now) + ")\n";
}

}  // namespace

std::string workText(const json& record, WallTime now) {
    std::string since = textOf(record, "started");
    if (since.empty()) since = textOf(record, "accepted");
    std::string text = headOf(record) + ", " + printable(textOf(record, "state"));
    if (!since.empty()) text += " since " + timeText(since, now);
    text += "\n";
    for (const json& command : commandsOf(record)) {
        if (textOf(command, "ended").empty()) text += processLine(command, now);
    }
    return text;
}

std::string recordText(const json& record, WallTime now) {
    std::string text = headOf(record) + ", " + printable(textOf(record, "state")) + "\n";
    if (const std::string asker = textOf(record, "asker"); !asker.empty()) {
        text += "  asked by " + printable(asker) + "\n";
    }
    text += timeLine("accepted ", textOf(record, "accepted"), now) +
            timeLine("started  ", textOf(record, "started"), now) +
            timeLine("ended    ", textOf(record, "ended"), now);
    for (const char* const words : {"reason", "hint"}) {
        const std::string value = textOf(record, words);
        if (!value.empty()) text += "  " + redacted(value) + "\n";
    }
    const json result = resultOf(record);
    if (result.is_object() && returnCodeOf(result) != 0) text += "  " + describeRow(result) + "\n";
    for (const json& command : commandsOf(record))
        text += commandReport(command);
    return text;
}

}  // namespace ctl
