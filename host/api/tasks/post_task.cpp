// POST /v1/tasks

#include <algorithm>
#include <chrono>
#include <nlohmann/json.hpp>
#include <random>

#include "host/api/route.h"
#include "host/api/services.h"
#include "host/api/tables/watched_query.h"
#include "host/api/tasks/task_document.h"
#include "host/api/time_text.h"
#include "host/guard/refusal.h"
#include "host/outcomes/shown_request.h"
#include "host/process/system/user_name.h"
#include "host/tables/conditions.h"
#include "host/tables/plugin_facts.h"
#include "routes/bad_request.h"

namespace host {
namespace {

constexpr std::size_t kLongestTransid = 84;
constexpr const char* kRetryAfter = "5";  // seconds

std::string upperCase(std::string name) {
    for (char& letter : name) {
        if (letter >= 'a' && letter <= 'z') letter = static_cast<char>(letter - 'a' + 'A');
    }
    return name;
}

std::string textIn(const nlohmann::json& body, const char* member) {
    const auto found = body.find(member);
    return found == body.end() ? std::string() : found->get<std::string>();
}

bool flagIn(const nlohmann::json& body, const char* member) {
    const auto found = body.find(member);
    return found != body.end() && found->get<bool>();
}

std::string madeUpTransid() {
    std::random_device source;
    char text[32];
    std::snprintf(text, sizeof text, "task-%08x%08x", static_cast<unsigned>(source()),
                  static_cast<unsigned>(source()));
    return text;
}

/// Every member that is a column of the request table.
std::vector<oxa::Predicate> conditionsOf(const nlohmann::json& body, const oxa::Table& table,
                                         const Services& services) {
    const ConditionReader reader(table, services.codePage);
    std::vector<oxa::Predicate> conditions;
    for (const auto& member : body.items()) {
        const std::string column = upperCase(member.key());
        if (table.find(column) == nullptr) continue;
        conditions.push_back(reader.equality(column, member.value().get<std::string>()));
    }
    return conditions;
}

void checkTransid(const std::string& transid) {
    if (transid.size() > kLongestTransid) {
        throw routes::BadRequest("\"transid\" is longer than 84 bytes");
    }
    if (!transid.empty() && transid.back() == ' ') {
        throw routes::BadRequest("\"transid\" ends with a blank");
    }
}

/// What the request asks for. Throws routes::BadRequest.
Task taskOf(const Call& call, const oxa::Table& table, Services& services) {
    const nlohmann::json& body = call.body();
    Task task;
    task.way = TaskWay::Journal;
    task.asker = userName(call.peer().user);
    task.conditions = conditionsOf(body, table, services);
    task.transid = valueIn(task.conditions, plugin::kTransidColumn);
    checkTransid(task.transid);
    const bool once = flagIn(body, "once");
    if (task.transid.empty()) {
        if (once) throw routes::BadRequest("\"once\" needs a \"transid\"");
        task.transid = madeUpTransid();
        task.conditions.push_back({std::string(plugin::kTransidColumn), OPER_EQ, task.transid});
    }
    task.request = shownRequest(task.conditions);
    task.forced = flagIn(body, "force");
    task.accepted = WallClock::now();
    if (body.contains("expires")) task.expires = timeOf(textIn(body, "expires"));
    if (once) {
        nlohmann::json content = body;
        content.erase("journal");
        task.once = services.journal.hashOf(content.dump());
    }
    return task;
}

void checkCommand(const Task& task) {
    const std::string_view command = task.value(plugin::kCommandColumn);
    if (command.empty()) throw routes::BadRequest("the body lacks \"command\"");
    if (plugin::runsAtOnce(command)) {
        throw routes::BadRequest(
            std::string(command) +
            " is carried out with its answer and never waits; ask with POST /v1/query");
    }
}

/// A repetition gets the answer that the first one got.
http::Reply replyAgain(const Task& first, const Task& task, const Services& services) {
    if (first.once != task.once) {
        return http::errorReply(409, "another request has this transid already: task " + first.id);
    }
    if (first.way == TaskWay::AtOnce && !first.guard.empty()) {
        return http::guardReply(409, first.reason, first.guard, first.hint);
    }
    return taskReply(202, first, services, Outputs::Shown);
}

http::Reply enter(Task task, Services& services) {
    if (!task.once) {
        services.journal.enter(task);
    } else if (const std::optional<Task> first = services.journal.enterOnce(task)) {
        return replyAgain(*first, task, services);
    }
    if (isOver(task.state)) services.tasks.hasEnded(task);
    services.dispatcher.wake();
    return taskReply(202, task, services, Outputs::Shown);
}

/// The task as one that is over before it could begin.
Task neverBegun(Task task, TaskState state, const std::string& reason) {
    task.way = TaskWay::AtOnce;
    task.state = state;
    task.reason = reason;
    task.ended = task.accepted;
    return task;
}

/// Asks the guards. A refusal is remembered if the request is to be carried out once.
void askGuards(const Task& task, Services& services) {
    if (!services.guarded) return;
    CommandRequest request(task.conditions, task.forced);
    try {
        services.guards.admitEarly(request, services.journal.mayChange(request.product()));
    } catch (const Refusal& refusal) {
        if (task.once && refusal.httpStatus() == 409) {
            Task remembered = neverBegun(task, TaskState::Refused, refusal.what());
            remembered.guard = refusal.guard();
            remembered.hint = refusal.hint();
            if (!services.journal.enterOnce(remembered)) services.tasks.hasEnded(remembered);
        }
        throw;
    }
}

struct RecordedEnd {
    const char* member;  ///< of the body: why, or what was done
    TaskState state;
};

/// How somebody else may say that a request ended which the plug-in never gets.
constexpr RecordedEnd kRecordedEnds[] = {{"refused", TaskState::Refused},
                                         {"cancelled", TaskState::Cancelled},
                                         {"expired", TaskState::Expired},
                                         {"done", TaskState::Done}};

/// The end that the body tells; null if it is a request like others.
const RecordedEnd* recordedEndIn(const Call& call) {
    const RecordedEnd* told = nullptr;
    for (const RecordedEnd& end : kRecordedEnds) {
        if (!call.body().contains(end.member)) continue;
        if (told != nullptr) {
            throw routes::BadRequest("a task ends once: as \"" + std::string(told->member) +
                                     "\" or as \"" + end.member + '"');
        }
        told = &end;
    }
    return told;
}

http::Reply enterEnded(const Call& call, Task task, const RecordedEnd& end, Services& services) {
    if (!task.once) throw routes::BadRequest('"' + std::string(end.member) + "\" needs \"once\"");
    const std::string reason = textIn(call.body(), end.member);
    return enter(neverBegun(std::move(task), end.state,
                            services.codePage.fromUtf8(reason).value_or(end.member)),
                 services);
}

}  // namespace

Endpoint postTask;

http::Answer postTask(Services& services, const Call& call) {
    const oxa::Table* const table = services.tables.find(std::string(plugin::kRequestTable));
    if (table == nullptr) return http::errorReply(404, "the plug-in takes no requests");
    Task task = taskOf(call, *table, services);
    if (const RecordedEnd* const end = recordedEndIn(call)) {
        return enterEnded(call, std::move(task), *end, services);
    }
    checkCommand(task);
    if (task.once) {
        const std::optional<Task> first = services.journal.findOnce(task.transid);
        if (first) return replyAgain(*first, task, services);
    }
    if (services.journal.waiting() >= services.maxQueued) {
        http::Reply reply = http::errorReply(429, "as many tasks wait as may");
        reply.fields.emplace_back("Retry-After", kRetryAfter);
        return reply;
    }
    askGuards(task, services);
    return enter(std::move(task), services);
}

}  // namespace host
