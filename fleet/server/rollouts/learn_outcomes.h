/// How roll-outs learn what hosts have told.
#pragma once

#include <cstddef>

#include "fleet/server/rollouts/rollout_store.h"

namespace fleet {

/// Ends the parts whose orders have got an outcome, in one transaction; no more than `most`.
/// Returns whether there may be more.
bool learnOutcomes(RolloutStore& store, std::size_t most);

/// The same, for all that there are.
void learnAllOutcomes(RolloutStore& store);

}  // namespace fleet
