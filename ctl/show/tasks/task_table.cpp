#include "ctl/show/tasks/task_table.h"

#include <nlohmann/json.hpp>

#include "ctl/client/row.h"
#include "ctl/client/tasks/task_request.h"
#include "ctl/show/printable.h"
#include "ctl/show/table.h"

using nlohmann::json;

namespace ctl {
namespace {

/// What was asked for: "INSTALL ux 6.3".
std::string requestText(const json& task) {
    std::string text = textOf(task, "command");
    for (const char* const part : {"product", "version", "targetmsn"}) {
        const std::string value = textOf(task, part);
        if (!value.empty()) text += " " + value;
    }
    return text;
}

std::string spanBetween(const std::optional<WallTime>& begin, WallTime end) {
    if (!begin) return {};
    return spanText(std::chrono::duration_cast<std::chrono::seconds>(end - *begin));
}

std::string chosenTransid(const json& task) {
    std::string transid = textOf(task, "transid");
    return isMadeUp(transid) ? std::string() : transid;
}

json lineOf(const json& task, WallTime now) {
    const std::optional<WallTime> started = parseTime(textOf(task, "started"));
    const std::optional<WallTime> ended = parseTime(textOf(task, "ended"));
    const std::string age = spanBetween(parseTime(textOf(task, "accepted")), now);
    return {{"id", textOf(task, "id")},
            {"state", textOf(task, "state")},
            {"request", requestText(task)},
            {"age", age.empty() ? age : age + " ago"},
            {"took", spanBetween(started, ended.value_or(now))},
            {"transid", chosenTransid(task)}};
}

}  // namespace

std::string taskTable(const json& tasks, WallTime now) {
    json lines = json::array();
    for (const json& task : tasks)
        lines.push_back(lineOf(task, now));
    return tableText(lines, {{"id", "TASK"},
                             {"state", "STATE"},
                             {"request", "COMMAND"},
                             {"age", "ASKED"},
                             {"took", "TOOK"},
                             {"transid", "TRANSID"}});
}

std::string taskTitle(const json& record) {
    std::string title = textOf(record, "command");
    for (char& letter : title) {
        if (letter >= 'A' && letter <= 'Z') letter = static_cast<char>(letter - 'A' + 'a');
    }
    const std::string product = textOf(record, "product");
    if (!product.empty()) title += " " + product;
    std::string name = chosenTransid(record);
    if (name.empty()) name = textOf(record, "id");
    return printable(title + " (" + name + ")");
}

std::chrono::seconds timeTaken(const json& record) {
    const std::optional<WallTime> accepted = parseTime(textOf(record, "accepted"));
    const std::optional<WallTime> ended = parseTime(textOf(record, "ended"));
    if (!accepted || !ended) return std::chrono::seconds(0);
    return std::chrono::duration_cast<std::chrono::seconds>(*ended - *accepted);
}

}  // namespace ctl
