#include "host/api/watched_query.h"

#include <pwd.h>

#include <algorithm>
#include <vector>

#include "host/commands/ear.h"
#include "host/tables/plugin_facts.h"

namespace host {
namespace {

/// Of a configuration that is read.
constexpr std::size_t kMostOutput = std::size_t{4} << 20;

/// The user's name, or else the number.
std::string userName(uid_t user) {
    passwd entry{};
    passwd* found = nullptr;
    std::vector<char> buffer(16 * 1024);
    if (::getpwuid_r(user, &entry, buffer.data(), buffer.size(), &found) != 0 || found == nullptr) {
        return std::to_string(user);
    }
    return entry.pw_name;
}

bool readsConfiguration(const Query& query) {
    return query.table->name == plugin::kRequestTable &&
           std::any_of(query.where.begin(), query.where.end(), [](const oxa::Predicate& condition) {
               return condition.column == plugin::kCommandColumn &&
                      condition.value == plugin::kGetConfiguration;
           });
}

std::string askerOf(const Query& query, const Peer& peer) {
    return query.table->name == plugin::kRequestTable ? userName(peer.user) : std::string();
}

/// What the table gets: a request as the guards leave it, other queries as they are.
Query admitted(const Services& services, const Query& query, bool force) {
    if (!services.guarded || query.table->name != plugin::kRequestTable) return query;
    CommandRequest request(query.where, force);
    services.guards.admit(request);
    return {query.table, request.conditions()};
}

}  // namespace

WatchedAnswer runWatched(Services& services, const Query& query, bool force, const Peer& peer) {
    const bool wantsOutput = services.guarded && readsConfiguration(query);
    TaskWatch::Request watched(services.watch, *query.table);
    const Query handedOn = admitted(services, query, force);
    // The task is what was asked for, not what the guards made of it.
    TaskList::Request task(services.tasks, query, askerOf(query, peer));
    ThreadEar ear(wantsOutput ? kMostOutput : 0);
    WatchedAnswer answer{run(handedOn), {}};
    answer.heard = ear.take();
    task.answered(answer.rows, answer.heard);
    watched.answered(answer.rows);
    return answer;
}

}  // namespace host
