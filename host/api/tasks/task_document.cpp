#include "host/api/tasks/task_document.h"

#include <nlohmann/json.hpp>

#include "host/api/time_text.h"
#include "host/tables/plugin_facts.h"
#include "host/tables/table_documents.h"

namespace host {
namespace {

using Json = nlohmann::ordered_json;

Json timeOrNull(const std::optional<WallClock::time_point>& time) {
    return time ? Json(timeText(*time)) : Json(nullptr);
}

std::string lowerCase(std::string name) {
    for (char& letter : name) {
        if (letter >= 'A' && letter <= 'Z') letter = static_cast<char>(letter - 'A' + 'a');
    }
    return name;
}

Json rowObject(std::string_view tableName, const std::string& row, const Services& services) {
    const oxa::Table* const table = services.tables.find(std::string(tableName));
    if (table == nullptr || row.empty()) return nullptr;
    return Json::parse(rowDocument(*table, row, services.codePage));
}

/// The row that answered; without the configuration, which is not kept.
Json replyObject(const Task& task, const Services& services) {
    Json reply = rowObject(plugin::kRequestTable, task.reply, services);
    const std::string_view command = task.value(plugin::kCommandColumn);
    if (reply.is_object() && plugin::holdsConfiguration(command)) {
        reply.erase(std::string(plugin::kContextColumn));
    }
    return reply;
}

/// What ends in this run is told from memory, which names the run alone.
std::string bootOf(const Task& task, const Services& services) {
    return task.boot.empty() && task.run == services.journal.run() ? bootName() : task.boot;
}

}  // namespace

Outputs outputsFor(const Peer& peer) {
    return peer.access == Access::Act ? Outputs::Shown : Outputs::Hidden;
}

Json commandObject(const Command& command, const CodePage& codePage, Outputs outputs) {
    Json object = {{"command", codePage.toUtf8(command.line)}};
    if (command.pid > 0) object["pid"] = command.pid;
    object["started"] = timeText(command.started);
    object["ended"] = timeOrNull(command.ended);
    if (command.exit) object["exit"] = *command.exit;
    if (command.signal) object["signal"] = *command.signal;
    if (!command.error.empty()) object["error"] = codePage.toUtf8(command.error);
    if (command.timedOut) object["timed_out"] = true;
    if (outputs == Outputs::Hidden) return object;
    object["stdout"] = codePage.toUtf8(command.out.text());
    object["stderr"] = codePage.toUtf8(command.err.text());
    return object;
}

Json taskSummary(const Task& task, const CodePage& codePage) {
    Json object = {{"id", task.id}};
    for (const std::string_view first :
         {plugin::kTransidColumn, plugin::kCommandColumn, plugin::kProductColumn}) {
        object[lowerCase(std::string(first))] = codePage.toUtf8(task.value(first));
    }
    for (const auto& [column, text] : task.request)
        object[lowerCase(column)] = codePage.toUtf8(text);
    object["state"] = nameOf(task.state);
    object["accepted"] = timeText(task.accepted);
    object["started"] = timeOrNull(task.started);
    object["ended"] = timeOrNull(task.ended);
    object["asker"] = codePage.toUtf8(task.asker);
    if (task.cancel && !isOver(task.state)) object["cancelling"] = true;
    if (task.expires) object["expires"] = timeText(*task.expires);
    for (const auto& [name, text] :
         {std::pair{"reason", &task.reason}, {"guard", &task.guard}, {"hint", &task.hint}}) {
        if (!text->empty()) object[name] = codePage.toUtf8(*text);
    }
    return object;
}

std::string taskDocument(const Task& task, const Services& services, Outputs outputs) {
    Json document = taskSummary(task, services.codePage);
    if (task.run) document["run"] = *task.run;
    const std::string boot = bootOf(task, services);
    if (!boot.empty()) document["boot"] = boot;
    if (task.forced) document["force"] = true;
    if (task.interruptions > 0) document["interruptions"] = task.interruptions;
    document["reply"] = replyObject(task, services);
    Json events = Json::array();
    for (const std::string& row : task.outcomes)
        events.push_back(rowObject(plugin::kOutcomeTable, row, services));
    document["events"] = std::move(events);
    Json commands = Json::array();
    for (const Command& command : task.commands)
        commands.push_back(commandObject(command, services.codePage, outputs));
    document["details"] = {{"commands", std::move(commands)}};
    if (document.contains("reason")) document["details"]["reason"] = document["reason"];
    return document.dump(-1, ' ', false, Json::error_handler_t::replace);
}

Reply taskReply(unsigned status, const Task& task, const Services& services, Outputs outputs) {
    return jsonReply(status, taskDocument(task, services, outputs));
}

}  // namespace host
