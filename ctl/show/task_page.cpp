#include "ctl/show/task_page.h"

#include <nlohmann/json.hpp>

#include "ctl/client/row.h"
#include "ctl/show/command_report.h"
#include "ctl/show/message_catalogue.h"
#include "ctl/show/printable.h"
#include "ctl/show/running_clock.h"
#include "ctl/show/shell_quoted.h"
#include "ctl/show/terminal.h"

using nlohmann::json;

namespace ctl {
namespace {

Page outcomePage(const std::string& title, const TaskResult& result) {
    const json& row = result.events.back();
    const std::string fault = returnCodeOf(row) == 0 ? faultOf(result.record) : std::string();
    Page page = showOutcome(title, row, result.elapsed, Format::Text);
    if (!fault.empty()) {
        page.out = printable(title) + ": " +
                   toned("reported as done, but " + fault, Tone::Bad, standardOutput()) + "\n";
        page.status = kHostReportedFailure;
    }
    if (page.status != kSuccess) page.out += failureReport(commandsOf(result.record));
    addDoubts(page, title, result);
    return page;
}

/// What follows the reply line.
Page textPage(const std::string& title, const TaskResult& result) {
    switch (result.end) {
        case TaskResult::End::Refused:
            return {{}, {}, kHostReportedFailure};
        case TaskResult::End::Accepted:
            return {};
        case TaskResult::End::Outcome:
            return outcomePage(title, result);
        case TaskResult::End::HostGone:
            return {{}, complaint("the host went away before the outcome came"), kNoHost};
        case TaskResult::End::TimedOut:
            break;
    }
    const Failure late(kNoOutcome, "no outcome within the time-out",
                       laterText(textOf(result.reply, "TRANSID")));
    return failurePage(late, Format::Text);
}

}  // namespace

std::string replyLine(const std::string& title, const json& reply) {
    if (returnCodeOf(reply) == 0) return printable(title) + ": accepted\n";
    return printable(title) + ": " + toned("refused", Tone::Bad, standardOutput()) + "; " +
           describeRow(reply) + "\n";
}

std::string outcomeLine(const std::string& title, const json& row,
                        std::chrono::milliseconds elapsed) {
    const bool ok = returnCodeOf(row) == 0;
    const std::string end =
        toned(ok ? "done" : "failed", ok ? Tone::Good : Tone::Bad, standardOutput());
    std::string line = printable(title) + ": " + end + " after " + elapsedText(elapsed);
    // A restart whose stop failed and whose start succeeded is a success with a message.
    if (!ok || !textOf(row, "RETMSGID").empty()) line += "; " + describeRow(row);
    return line + "\n";
}

ExitStatus statusOf(const json& row) {
    return returnCodeOf(row) == 0 ? kSuccess : kHostReportedFailure;
}

Page showOutcome(const std::string& title, const json& row, std::chrono::milliseconds elapsed,
                 Format format) {
    if (format == Format::Json) return jsonPage(row, statusOf(row));
    return {outcomeLine(title, row, elapsed), {}, statusOf(row)};
}

json taskDocument(const TaskResult& result) {
    json document = {{"reply", result.reply}, {"events", result.events}};
    if (result.record.is_object()) {
        json task = result.record;
        const auto details = task.find("details");
        if (details != task.end()) document["details"] = *details;
        for (const char* const elsewhere : {"reply", "events", "details"})
            task.erase(elsewhere);
        document["task"] = std::move(task);
    }
    if (!result.doubt.empty()) document["doubt"] = result.doubt;
    return document;
}

std::string laterText(const std::string& transid) {
    return "zavctl task show " + shellQuoted(transid) + " tells how it ended";
}

std::string faultOf(const json& record) {
    if (textOf(record, "state") != "failed") return {};
    for (const json& command : commandsOf(record)) {
        if (!diedUnnoticed(command)) continue;
        const bool hasRun = textOf(command, "error").empty();
        return (hasRun ? "the command was " : "the command ") + endText(command);
    }
    return "the host counts it as failed";
}

void addDoubts(Page& page, const std::string& title, const TaskResult& result) {
    if (!result.doubt.empty()) {
        page.err += complaint(title + ": " + result.doubt);
        if (page.status == kSuccess) page.status = kHostReportedFailure;
    }
    if (!result.note.empty()) page.err += complaint("note: " + result.note);
}

Page showTask(const std::string& title, const TaskResult& result, Format format) {
    Page page = textPage(title, result);
    if (format == Format::Json) page.out = jsonText(taskDocument(result));
    return page;
}

}  // namespace ctl
