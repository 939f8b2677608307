/// Roll-outs as documents.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "fleet/server/keys/trust/members.h"
#include "fleet/server/rollouts/rollout_view.h"

namespace fleet {

nlohmann::json rolloutDocument(const RolloutView& view);
/// A host's part in a roll-out, with the host's name if it is a member still.
nlohmann::json partDocument(const PartView& view, const Members& members);

}  // namespace fleet
