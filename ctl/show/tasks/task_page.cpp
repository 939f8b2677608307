#include "ctl/show/tasks/task_page.h"

#include <nlohmann/json.hpp>

#include "ctl/client/row.h"
#include "ctl/show/message_catalogue.h"
#include "ctl/show/printable.h"
#include "ctl/show/shell_quoted.h"
#include "ctl/show/tasks/command_report.h"
#include "ctl/show/tasks/running_clock.h"
#include "ctl/show/terminal.h"

using nlohmann::json;

namespace ctl {
namespace {

/// Why a task is over whose end no row tells, where the host does not say.
const char* usualReason(const std::string& state) {
    if (state == "interrupted")
        return "the host ended in the middle of it: it may have run in part";
    if (state == "expired") return "its turn came too late";
    if (state == "refused") return "the host did not hand it over";
    return "";
}

Page statePage(const std::string& title, const TaskResult& result) {
    const bool isDone = textOf(result.record, "state") == "done";
    Page page{stateLine(title, result.record, result.elapsed),
              {},
              isDone ? kSuccess : kHostReportedFailure};
    if (!isDone && !commandsOf(result.record).empty()) {
        page.out += failureReport(commandsOf(result.record));
    }
    addDoubts(page, title, result);
    return page;
}

/// The row that says how the command itself ended.
const json& lastRow(const TaskResult& result) {
    return result.completion.is_null() ? result.events.back() : result.completion;
}

Page outcomePage(const std::string& title, const TaskResult& result) {
    const json& row = lastRow(result);
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
        case TaskResult::End::Over:
            return statePage(title, result);
        case TaskResult::End::HostGone:
            return {{}, complaint("the host went away before the outcome came"), kNoHost};
        case TaskResult::End::TimedOut:
            break;
    }
    const std::string transid = textOf(result.record, "transid");
    const Failure late(kNoOutcome, "no outcome within the time-out",
                       laterText(transid.empty() ? textOf(result.reply, "TRANSID") : transid));
    return failurePage(late, Format::Text);
}

}  // namespace

std::string replyLine(const std::string& title, const json& reply) {
    if (reply.is_null() || returnCodeOf(reply) == 0) return printable(title) + ": accepted\n";
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

std::string stateLine(const std::string& title, const json& record,
                      std::chrono::milliseconds elapsed) {
    const std::string state = textOf(record, "state");
    const Tone tone = state == "done" ? Tone::Good : Tone::Bad;
    std::string line = printable(title) + ": " + toned(printable(state), tone, standardOutput()) +
                       " after " + elapsedText(elapsed);
    std::string reason = textOf(record, "reason");
    if (reason.empty()) reason = usualReason(state);
    if (!reason.empty()) line += "; " + redacted(reason);
    line += "\n";
    if (const std::string hint = textOf(record, "hint"); !hint.empty()) {
        line += "  " + printable(hint) + "\n";
    }
    return line;
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
    if (!result.completion.is_null()) document["completion"] = result.completion;
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
