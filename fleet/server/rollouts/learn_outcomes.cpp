#include "fleet/server/rollouts/learn_outcomes.h"

#include "fleet/server/rollouts/end_states.h"
#include "fleet/server/rollouts/short_reason.h"

namespace fleet {
namespace {

constexpr std::size_t kLearntAtOnce = 1'000;

/// The host's word counts in every state of the part. An order may run that is still waiting here,
/// when this database was put back; and "unknown" may give way to what really happened.
void endPart(RolloutStore& store, const ToldPart& told) {
    Part part = told.part;
    part.state = PartState::Over;
    part.end = told.outcome.state;
    part.reason = shortReason(told.outcome);
    if (!isFailure(part.end)) {
        part.failure = FailureState::None;
    } else if (part.failure == FailureState::None) {
        part.failure = FailureState::Counts;
    }
    store.keepPart(part);
    store.forgetTold(part);
}

}  // namespace

bool learnOutcomes(RolloutStore& store, std::size_t most) {
    if (store.told(1).empty()) return false;
    std::size_t count = 0;
    store.atomically([&] {
        const std::vector<ToldPart> told = store.told(most);
        for (const ToldPart& one : told)
            endPart(store, one);
        count = told.size();
    });
    return count == most;
}

void learnAllOutcomes(RolloutStore& store) {
    while (learnOutcomes(store, kLearntAtOnce)) {
    }
}

}  // namespace fleet
