// POST /v1/rollouts/{id}/pause, resume, abort and retry-failed

#include <memory>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <vector>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/documents/rollout_document.h"
#include "fleet/server/api/rollouts/given_orders.h"
#include "fleet/server/api/rollouts/own_rollout.h"
#include "fleet/server/rollouts/rollout_error.h"

namespace fleet {

ApiEndpoint postPause, postResume, postAbort, postRetryFailed;

namespace {

using Orders = std::shared_ptr<const std::vector<std::string>>;

/// Does it, if the roll-out is the visitor's or the visitor an admin, and shows what is then. What
/// comes without orders costs little, and stops something perhaps: that waits for nothing.
template <typename Change>
http::Answer change(Visit& visit, const Call& call, const Orders& orders, Change act) {
    insistOnOwn(visit, call.required("id"));
    std::optional<OneAtATime> turn;
    if (orders && !orders->empty()) turn.emplace(visit);
    const RolloutView after = visit.services.ask(
        [act, id = call.required("id"), by = visit.asOperator()](CentreDesk& desk) {
            act(desk, id, by);
            return desk.rollouts.show(id, desk.now);
        });
    return http::jsonReply(200, textOf(rolloutDocument(after)));
}

}  // namespace

http::Answer postPause(Visit& visit, const Call& call) {
    return change(visit, call, nullptr,
                  [](CentreDesk& desk, const std::string& id, const RolloutOperator& by) {
                      desk.rollouts.pause(id, by, desk.now);
                  });
}

http::Answer postResume(Visit& visit, const Call& call) {
    const Orders orders = givenOrders(visit, call);
    return change(visit, call, orders,
                  [orders](CentreDesk& desk, const std::string& id, const RolloutOperator& by) {
                      desk.rollouts.resume(id, by, *orders, desk.now);
                  });
}

http::Answer postAbort(Visit& visit, const Call& call) {
    const Orders orders = givenOrders(visit, call);
    return change(visit, call, orders,
                  [orders](CentreDesk& desk, const std::string& id, const RolloutOperator& by) {
                      desk.rollouts.abort(id, by, *orders, desk.now);
                  });
}

http::Answer postRetryFailed(Visit& visit, const Call& call) {
    const bool isForced = call.body().contains("force") && call.body().at("force").get<bool>();
    const Orders orders = givenOrders(visit, call);
    return change(
        visit, call, orders,
        [orders, isForced](CentreDesk& desk, const std::string& id, const RolloutOperator& by) {
            desk.rollouts.retryFailed(id, by, *orders, isForced, desk.now);
        });
}

}  // namespace fleet
