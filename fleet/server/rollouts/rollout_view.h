/// Roll-outs as they are shown.
#pragma once

#include <cstddef>
#include <map>
#include <string>
#include <vector>

#include "fleet/server/rollouts/rollout_store.h"

namespace fleet {

/// How far some of the hosts are.
struct RolloutCounts {
    std::size_t waiting = 0;               ///< their orders are not released
    std::size_t released = 0;              ///< the roll-out is waiting for these
    std::map<EndState, std::size_t> over;  ///< by how it ended, as in "done" and "failed"
};

struct RolloutProgress {
    RolloutCounts all;
    std::vector<RolloutCounts> waves;  ///< the first one first
    std::size_t failures = 0;          ///< that were ever seen and not tried again
    std::size_t away = 0;              ///< of those released: not heard for kAwayAfter
    std::size_t unconfirmed = 0;       ///< of those released: expired, and no host has told that
    std::size_t expired = 0;           ///< of those waiting: to be signed anew
};

struct RolloutView {
    Rollout rollout;
    RolloutProgress progress;
};

/// A host's part.
struct PartView {
    PartSight sight;
    bool isAway = false;         ///< released, and the host not heard for kAwayAfter
    bool isUnconfirmed = false;  ///< released and expired, and the host has not told that
};

RolloutView viewOf(const RolloutStore& store, const Rollout& rollout, Moment now);
PartView viewOf(const PartSight& sight, Moment now);

/// Names for people and for documents.
const char* nameOf(RolloutState state);
const char* nameOf(PauseCause cause);
/// "waiting", "released", or how the part ended.
std::string nameOfState(const Part& part);

}  // namespace fleet
