#include "fleet/server/rollouts/rollout_view.h"

#include <array>

#include "fleet/server/rollouts/end_states.h"

namespace fleet {
namespace {

void addTally(RolloutCounts& counts, const PartTally& tally) {
    switch (tally.state) {
        case PartState::Waiting:
            counts.waiting += tally.hosts;
            break;
        case PartState::Released:
            counts.released += tally.hosts;
            break;
        case PartState::Over:
            counts.over[tally.end] += tally.hosts;
            break;
    }
}

}  // namespace

RolloutView viewOf(const RolloutStore& store, const Rollout& rollout, Moment now) {
    RolloutView view;
    view.rollout = rollout;
    RolloutProgress& progress = view.progress;
    progress.waves.resize(rollout.waves);
    for (const PartTally& tally : store.tallies(rollout.row)) {
        addTally(progress.all, tally);
        if (tally.wave > 0 && tally.wave <= progress.waves.size())
            addTally(progress.waves[tally.wave - 1], tally);
        if (tally.state == PartState::Over && isFailure(tally.end))
            progress.failures += tally.hosts;
    }
    progress.away = store.countAway(rollout.row, now - kAwayAfter);
    progress.unconfirmed = store.countUnconfirmed(rollout.row, now);
    progress.expired = store.countExpired(rollout.row, now);
    return view;
}

PartView viewOf(const PartSight& sight, Moment now) {
    PartView view;
    view.sight = sight;
    const bool isReleased = sight.part.state == PartState::Released;
    view.isAway = isReleased && sight.heard < now - kAwayAfter;
    view.isUnconfirmed = isReleased && sight.part.expires <= now;
    return view;
}

const char* nameOf(RolloutState state) {
    constexpr std::array<const char*, 4> kNames = {"running", "paused", "aborted", "finished"};
    return kNames.at(static_cast<std::size_t>(state));
}

const char* nameOf(PauseCause cause) {
    constexpr std::array<const char*, 5> kNames = {"", "operator", "failures", "expiry", "restore"};
    return kNames.at(static_cast<std::size_t>(cause));
}

std::string nameOfState(const Part& part) {
    if (part.state == PartState::Over) return part.end;
    return part.state == PartState::Released ? "released" : "waiting";
}

}  // namespace fleet
