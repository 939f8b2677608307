#include "fleet/server/api/rollouts/own_rollout.h"

namespace fleet {

void insistOnOwn(const Visit& visit, const std::string& id) {
    if (visit.isAdmin()) return;
    const auto rollout =
        visit.services.ask([id](CentreDesk& desk) { return desk.rolloutStore.rollout(id); });
    if (rollout && rollout->by.name != visit.grant.name) {
        throw Forbidden("the roll-out is " + rollout->by.name + "'s");
    }
}

}  // namespace fleet
