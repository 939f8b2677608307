#include "ctl/show/task_page.h"

#include <nlohmann/json.hpp>

#include "ctl/client/row.h"
#include "ctl/show/message_catalogue.h"
#include "ctl/show/running_clock.h"

using nlohmann::json;

namespace ctl {
namespace {

/// What follows the reply line.
Page textPage(const std::string& title, const TaskResult& result) {
    switch (result.end) {
        case TaskResult::End::Refused:
            return {{}, {}, kHostReportedFailure};
        case TaskResult::End::Accepted:
            return {};
        case TaskResult::End::Outcome:
            return showOutcome(title, result.events.back(), result.elapsed, Format::Text);
        case TaskResult::End::HostGone:
            return {{}, complaint("the host went away before the outcome came"), kNoHost};
        case TaskResult::End::TimedOut:
            break;
    }
    return {{}, complaint("no outcome within the time-out"), kNoOutcome};
}

}  // namespace

std::string replyLine(const std::string& title, const json& reply) {
    if (returnCodeOf(reply) == 0) return title + ": accepted\n";
    return title + ": refused; " + describeRow(reply) + "\n";
}

std::string outcomeLine(const std::string& title, const json& row,
                        std::chrono::milliseconds elapsed) {
    const bool ok = returnCodeOf(row) == 0;
    std::string line = title + (ok ? ": done after " : ": failed after ") + elapsedText(elapsed);
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
    return {{"reply", result.reply}, {"events", result.events}};
}

Page showTask(const std::string& title, const TaskResult& result, Format format) {
    Page page = textPage(title, result);
    if (format == Format::Json) page.out = jsonText(taskDocument(result));
    return page;
}

}  // namespace ctl
