#include "host/api/tables/watched_query.h"

#include <algorithm>
#include <memory>
#include <vector>

#include "host/api/tasks/restart_install.h"
#include "host/commands/ear.h"
#include "host/guard/refusal.h"
#include "host/outcomes/shown_request.h"
#include "host/process/system/user_name.h"
#include "host/tables/plugin_facts.h"

namespace host {
namespace {

/// Of a configuration that is read.
constexpr std::size_t kMostOutput = std::size_t{4} << 20;

bool readsConfiguration(const Query& query) {
    return query.table->name == plugin::kRequestTable &&
           std::any_of(query.where.begin(), query.where.end(), [](const oxa::Predicate& condition) {
               return condition.column == plugin::kCommandColumn &&
                      condition.value == plugin::kGetConfiguration;
           });
}

bool hasValue(const Query& query, std::string_view column) {
    return std::any_of(query.where.begin(), query.where.end(), [column](const auto& condition) {
        return condition.column == column && !condition.value.empty();
    });
}

/// Whether it is a request that the plug-in may queue: it refuses what lacks a value.
bool mayBeQueued(const Query& query) {
    if (query.table->name != plugin::kRequestTable) return false;
    const std::string command = valueIn(query.where, plugin::kCommandColumn);
    for (const plugin::QueuedCommand& known : plugin::kQueuedCommands) {
        if (command != known.name) continue;
        return std::all_of(known.required.begin(), known.required.end(), [&](const auto& column) {
            return column.empty() || hasValue(query, column);
        });
    }
    return false;
}

std::string askerOf(const Query& query, const http::Peer& peer) {
    return query.table->name == plugin::kRequestTable ? userName(peer.user) : std::string();
}

/// What the table gets: a request as the guards leave it, other queries as they are.
Query admitted(Services& services, const Query& query, bool force) {
    if (!services.guarded || query.table->name != plugin::kRequestTable) return query;
    CommandRequest request(query.where, force);
    services.guards.admit(request);
    return {query.table, request.conditions()};
}

/// What protects files of the home while a request of this kind is handed on; null if nothing needs
/// to.
std::unique_ptr<ParameterKeeper::Hold> protectionFor(Services& services, const Query& query) {
    if (!services.guarded || query.table->name != plugin::kRequestTable) return nullptr;
    return services.startUpParameters.hold(CommandRequest(query.where, false));
}

/// A request goes to the plug-in at once, and would run beside what it must not meet.
void insistOnTurn(Services& services, const Query& query) {
    if (!services.leftovers.gone()) {
        throw NotKept("commands that an earlier run of the host began have not ended yet",
                      "leftovers");
    }
    const bool install = services.dispatcher.awaitsInstall() || services.tasks.restartsHost();
    if (install || (mayRestart(query) && services.tasks.mayRestartHost())) {
        throw NotKept("an install that may restart the host has not ended yet", "restart-turn");
    }
}

/// How a task ends that the plug-in did not get.
Task endOf(Task task, TaskState state, const std::string& reason) {
    task.state = state;
    task.reason = reason;
    task.ended = WallClock::now();
    return task;
}

std::optional<Task> tryHandOver(Services& services, const Task& task) {
    const Query query{services.tables.find(std::string(plugin::kRequestTable)), task.conditions};
    TaskWatch::Request watched(services.watch, *query.table);
    const Query handedOn = admitted(services, query, task.forced);
    const auto protection = protectionFor(services, handedOn);
    const std::string fault = mayRestart(query) ? forgetOlderResult(services) : std::string();
    if (!fault.empty()) return endOf(task, TaskState::Failed, fault);
    TaskList::Request request(services.tasks, task);
    ThreadEar ear;
    const oxa::Rows rows = run(handedOn);
    if (!request.answered(rows, ear.take())) {
        return endOf(task, TaskState::Failed,
                     "the plug-in did not say whether it accepts the task");
    }
    watched.answered(rows);
    return std::nullopt;
}

}  // namespace

WatchedAnswer runWatched(Services& services, const Query& query, bool force,
                         const http::Peer& peer) {
    if (mayBeQueued(query) && services.guarded) insistOnTurn(services, query);
    const bool wantsOutput = services.guarded && readsConfiguration(query);
    TaskWatch::Request watched(services.watch, *query.table);
    const Query handedOn = admitted(services, query, force);
    if (services.guarded && mayRestart(query)) {
        const std::string fault = forgetOlderResult(services);
        if (!fault.empty()) throw NotKept(fault, "old-result");
    }
    const auto protection = protectionFor(services, handedOn);
    // The task is what was asked for, not what the guards made of it.
    TaskList::Request task(services.tasks, query, askerOf(query, peer), force);
    ThreadEar ear(wantsOutput ? kMostOutput : 0);
    WatchedAnswer answer{run(handedOn), {}};
    answer.heard = ear.take();
    task.answered(answer.rows, answer.heard);
    watched.answered(answer.rows);
    return answer;
}

std::optional<Task> handOver(Services& services, const Task& task) {
    try {
        return tryHandOver(services, task);
    } catch (const Refusal& refused) {
        services.refusals.at(refused.guard()).add();
        Task ended = endOf(task, TaskState::Refused, refused.what());
        ended.guard = refused.guard();
        ended.hint = refused.hint();
        return ended;
    } catch (const QueryFailed& failed) {
        return endOf(task, TaskState::Failed, failed.what());
    }
}

}  // namespace host
