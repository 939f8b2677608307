#include "host/api/tasks/task_document.h"

#include <nlohmann/json.hpp>

#include "host/tables/masked_row.h"
#include "host/tables/plugin_facts.h"
#include "host/tables/table_documents.h"
#include "text/utc_time.h"

namespace host {

Schema taskStateSchema, taskSummarySchema, taskSchema, timeSchema, rowSchema;

namespace {

using Json = nlohmann::ordered_json;

Json timeOrNull(const std::optional<WallClock::time_point>& time) {
    return time ? Json(text::utcTime(*time)) : Json(nullptr);
}

std::string lowerCase(std::string name) {
    for (char& letter : name) {
        if (letter >= 'A' && letter <= 'Z') letter = static_cast<char>(letter - 'A' + 'a');
    }
    return name;
}

Json rowObject(std::string_view tableName, const std::string& row, const Services& services,
               Outputs outputs) {
    const oxa::Table* const table = services.tables.find(std::string(tableName));
    if (table == nullptr || row.empty()) return nullptr;
    const std::string seen = outputs == Outputs::Shown ? row : rowForReaders(*table, row);
    return Json::parse(rowDocument(*table, seen, services.codePage));
}

/// The row that answered; without the configuration, which is not kept.
Json replyObject(const Task& task, const Services& services, Outputs outputs) {
    Json reply = rowObject(plugin::kRequestTable, task.reply, services, outputs);
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

Outputs outputsFor(const http::Peer& peer) {
    return peer.access == http::Access::Act ? Outputs::Shown : Outputs::Hidden;
}

Json commandObject(const Command& command, const CodePage& codePage, Outputs outputs) {
    Json object = {{"command", codePage.toUtf8(command.line)}};
    if (command.pid > 0) object["pid"] = command.pid;
    object["started"] = text::utcTime(command.started);
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
    object["accepted"] = text::utcTime(task.accepted);
    object["started"] = timeOrNull(task.started);
    object["ended"] = timeOrNull(task.ended);
    object["asker"] = codePage.toUtf8(task.asker);
    if (task.cancel && !isOver(task.state)) object["cancelling"] = true;
    if (task.expires) object["expires"] = text::utcTime(*task.expires);
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
    document["reply"] = replyObject(task, services, outputs);
    Json events = Json::array();
    for (const std::string& row : task.outcomes)
        events.push_back(rowObject(plugin::kOutcomeTable, row, services, outputs));
    document["events"] = std::move(events);
    Json commands = Json::array();
    for (const Command& command : task.commands)
        commands.push_back(commandObject(command, services.codePage, outputs));
    document["details"] = {{"commands", std::move(commands)}};
    if (document.contains("reason")) document["details"]["reason"] = document["reason"];
    return document.dump(-1, ' ', false, Json::error_handler_t::replace);
}

http::Reply taskReply(unsigned status, const Task& task, const Services& services,
                      Outputs outputs) {
    return http::jsonReply(status, taskDocument(task, services, outputs));
}

nlohmann::ordered_json taskStateSchema(Components&) {
    std::vector<std::string> names;
    for (const auto& [state, name] : kTaskStates)
        names.emplace_back(name);
    nlohmann::ordered_json state = shape::oneOf("The state of a task.", names);
    state["title"] = "TaskState";
    return state;
}

std::vector<shape::Property> commandProperties(Components& components) {
    const Json time = components.ref(timeSchema);
    return {{"command", shape::text("the command line")},
            {"pid", shape::wholeNumber("the process, if there was one"), Need::Optional},
            {"started", shape::about("when it began", time)},
            {"ended", shape::orNull(shape::about("when it ended; null while it runs", time))},
            {"exit", shape::wholeNumber("the exit status, if it had one"), Need::Optional},
            {"signal", shape::wholeNumber("the signal that ended it, if one did"), Need::Optional},
            {"error", shape::text("why it could not be executed"), Need::Optional},
            {"timed_out", shape::yesOrNo("true: its time was over"), Need::Optional},
            {"stdout", shape::text("the end of its output; not for readers"), Need::Optional},
            {"stderr", shape::text("the end of its errors; not for readers"), Need::Optional}};
}

namespace {

/// The columns of the request table that requests are made of; others are there if somebody set
/// them.
std::vector<shape::Property> summaryProperties(Components& components) {
    const Json time = components.ref(timeSchema);
    return {
        {"id", shape::text("no two tasks have the same")},
        {"transid", shape::text("the requester's name for it")},
        {"command", shape::text("the command")},
        {"product", shape::text("the product; may be empty")},
        {"version", shape::text("the product's version"), Need::Optional},
        {"targetmsn", shape::text("the managed system"), Need::Optional},
        {"optional", shape::text("the command's option"), Need::Optional},
        {"context", shape::text("its text"), Need::Optional},
        {"uaconfig", shape::text("the universal agent's metafile"), Need::Optional},
        {"uascript", shape::text("its scripts"), Need::Optional},
        {"state", components.ref(taskStateSchema)},
        {"accepted", shape::about("when it was accepted", time)},
        {"started", shape::orNull(shape::about("when it began", time))},
        {"ended", shape::orNull(shape::about("when it was over", time))},
        {"asker", shape::text("the user who asked for it")},
        {"cancelling", shape::yesOrNo("true: somebody has cancelled it, and it is not over yet"),
         Need::Optional},
        {"expires", shape::about("when it must have begun", time), Need::Optional},
        {"reason", shape::text("why it ended as it did, where no row says so"), Need::Optional},
        {"guard", shape::text("the guard that refused it"), Need::Optional},
        {"hint", shape::text("that guard's way out"), Need::Optional}};
}

}  // namespace

nlohmann::ordered_json taskSummarySchema(Components& components) {
    Json summary =
        shape::object("TaskSummary", "What a list says of a task.", summaryProperties(components));
    summary["additionalProperties"] = shape::text("another column of the request table");
    return summary;
}

nlohmann::ordered_json taskSchema(Components& components) {
    const Json command =
        shape::object("Command", "What one command of a task did.", commandProperties(components));
    const Json reason = shape::text("as beside the state");
    const Json details =
        shape::object("Details", "What the task's commands did.",
                      {{"commands", shape::listOf("the commands, in their order", command)},
                       {"reason", reason, Need::Optional}});
    const Json row = components.ref(rowSchema);
    std::vector<shape::Property> members = summaryProperties(components);
    for (const shape::Property& member : std::initializer_list<shape::Property>{
             {"run", shape::wholeNumber("the host's run that handed it over"), Need::Optional},
             {"boot", shape::text("the name of the machine's start in which that was"),
              Need::Optional},
             {"force", shape::yesOrNo("true: sent although the product is not there"),
              Need::Optional},
             {"interruptions", shape::wholeNumber("unclean ends of the host that cut it off"),
              Need::Optional},
             {"reply", shape::orNull(shape::about("the row that answered the request", row))},
             {"events", shape::listOf("its outcomes, rows of KAGDYST", shape::orNull(row))},
             {"details", details}})
        members.push_back(member);
    Json task = shape::object("Task", "Everything about a task.", members);
    task["additionalProperties"] = shape::text("another column of the request table");
    return task;
}

}  // namespace host
