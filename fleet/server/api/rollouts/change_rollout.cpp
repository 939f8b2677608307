// POST /v1/rollouts/{id}/pause, resume, abort and retry-failed

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/documents/rollout_document.h"
#include "fleet/server/api/rollouts/given_orders.h"
#include "fleet/server/rollouts/rollout_error.h"

namespace fleet {

ApiEndpoint postPause, postResume, postAbort, postRetryFailed;

namespace {

/// Does it, if the roll-out is the visitor's or the visitor an admin, and shows what is then.
template <typename Change>
http::Answer change(Visit& visit, const Call& call, Change act) {
    const RolloutView after =
        visit.services.ask([act, id = call.required("id"), by = visit.asOperator(),
                            isAdmin = visit.isAdmin()](CentreDesk& desk) {
            const auto rollout = desk.rolloutStore.rollout(id);
            if (rollout && rollout->by.name != by.name && !isAdmin) {
                throw Forbidden("the roll-out is " + rollout->by.name + "'s");
            }
            act(desk, id, by);
            return desk.rollouts.show(id, desk.now);
        });
    return http::jsonReply(200, textOf(rolloutDocument(after)));
}

}  // namespace

http::Answer postPause(Visit& visit, const Call& call) {
    return change(visit, call,
                  [](CentreDesk& desk, const std::string& id, const RolloutOperator& by) {
                      desk.rollouts.pause(id, by, desk.now);
                  });
}

http::Answer postResume(Visit& visit, const Call& call) {
    return change(visit, call,
                  [orders = givenOrders(visit, call)](CentreDesk& desk, const std::string& id,
                                                      const RolloutOperator& by) {
                      desk.rollouts.resume(id, by, orders, desk.now);
                  });
}

http::Answer postAbort(Visit& visit, const Call& call) {
    return change(visit, call,
                  [orders = givenOrders(visit, call)](CentreDesk& desk, const std::string& id,
                                                      const RolloutOperator& by) {
                      desk.rollouts.abort(id, by, orders, desk.now);
                  });
}

http::Answer postRetryFailed(Visit& visit, const Call& call) {
    const bool isForced = call.body().contains("force") && call.body().at("force").get<bool>();
    return change(visit, call,
                  [orders = givenOrders(visit, call), isForced](
                      CentreDesk& desk, const std::string& id, const RolloutOperator& by) {
                      desk.rollouts.retryFailed(id, by, orders, isForced, desk.now);
                  });
}

}  // namespace fleet
