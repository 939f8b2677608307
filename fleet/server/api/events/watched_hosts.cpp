#include "fleet/server/api/events/watched_hosts.h"

#include <utility>

#include "fleet/server/api/documents/host_sight.h"

namespace fleet {
namespace {

Moment sinceOf(const std::string& state, Moment heard, Moment now) {
    return state == "here" || state == "away" ? heard : now;
}

bool looksOther(const HostFace& before, const HostFace& after) {
    return before.name != after.name || before.labels != after.labels ||
           before.stopped != after.stopped || before.blocked != after.blocked;
}

}  // namespace

std::optional<HostChange> WatchedHosts::note(const std::string& host, const HostFace& face,
                                             bool hasTold, Moment now) {
    const auto [found, isNew] = hosts_.try_emplace(host);
    Known& known = found->second;
    const std::string state = hostState(face.heard, face.stopped, now);
    const bool isOther = isNew || hasTold || state != known.state || looksOther(known.face, face);
    if (state != known.state) known.since = sinceOf(state, face.heard, now);
    known.state = state;
    known.face = face;
    if (!isOther) return std::nullopt;
    return HostChange{host, face, state, known.since};
}

std::vector<HostChange> WatchedHosts::goneAway(Moment now) {
    std::vector<HostChange> changes;
    for (auto& [host, known] : hosts_) {
        const std::string state = hostState(known.face.heard, known.face.stopped, now);
        if (state == known.state) continue;
        known.state = state;
        known.since = sinceOf(state, known.face.heard, now);
        changes.push_back({host, known.face, state, known.since});
    }
    return changes;
}

std::vector<HostChange> WatchedHosts::retired(const Members& members, Moment now) {
    std::vector<HostChange> changes;
    for (auto host = hosts_.begin(); host != hosts_.end();) {
        if (members.count(host->first) != 0) {
            ++host;
            continue;
        }
        changes.push_back({host->first, host->second.face, "retired", now});
        host = hosts_.erase(host);
    }
    return changes;
}

std::vector<std::string> WatchedHosts::changedMembers(const Members& members) const {
    std::vector<std::string> changed;
    for (const auto& [host, member] : members) {
        const auto known = hosts_.find(host);
        const bool isSame = known != hosts_.end() && known->second.face.name == member.name &&
                            known->second.face.labels == member.labels;
        if (!isSame) changed.push_back(host);
    }
    return changed;
}

}  // namespace fleet
