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

using ReadOrders = std::vector<IncomingOrder>;

/// What comes without orders costs little, and stops something perhaps: that waits for nothing.
bool bringsOrders(const Call& call) {
    const auto orders = call.body().find("orders");
    return call.body().contains("batch") ||
           (orders != call.body().end() && orders->is_array() && !orders->empty());
}

/// Does it on the centre's thread, and shows what is then.
template <typename Act>
http::Answer done(Visit& visit, const std::string& id, Act act) {
    const RolloutView after =
        visit.services.ask([act, id, by = visit.asOperator()](CentreDesk& desk) {
            act(desk, id, by);
            return desk.rollouts.show(id, desk.now);
        });
    return http::jsonReply(200, textOf(rolloutDocument(after)));
}

/// The same, if the roll-out is the visitor's or the visitor an admin, with the orders that come
/// along.
template <typename Act>
http::Answer doneWithOrders(Visit& visit, const Call& call, Act act) {
    insistOnOwn(visit, call.required("id"));
    std::optional<OneAtATime> turn;
    if (bringsOrders(call)) turn.emplace(visit);
    return done(visit, call.required("id"),
                [act, orders = std::make_shared<const ReadOrders>(givenOrders(visit, call))](
                    CentreDesk& desk, const std::string& id, const RolloutOperator& by) {
                    act(desk.rollouts, id, by, *orders, desk.now);
                });
}

}  // namespace

http::Answer postPause(Visit& visit, const Call& call) {
    insistOnOwn(visit, call.required("id"));
    return done(visit, call.required("id"),
                [](CentreDesk& desk, const std::string& id, const RolloutOperator& by) {
                    desk.rollouts.pause(id, by, desk.now);
                });
}

http::Answer postResume(Visit& visit, const Call& call) {
    return doneWithOrders(
        visit, call,
        [](Rollouts& rollouts, const std::string& id, const RolloutOperator& by,
           const ReadOrders& orders, Moment now) { rollouts.resume(id, by, orders, now); });
}

http::Answer postAbort(Visit& visit, const Call& call) {
    return doneWithOrders(
        visit, call,
        [](Rollouts& rollouts, const std::string& id, const RolloutOperator& by,
           const ReadOrders& orders, Moment now) { rollouts.abort(id, by, orders, now); });
}

http::Answer postRetryFailed(Visit& visit, const Call& call) {
    const bool isForced = call.body().contains("force") && call.body().at("force").get<bool>();
    return doneWithOrders(
        visit, call,
        [isForced](Rollouts& rollouts, const std::string& id, const RolloutOperator& by,
                   const ReadOrders& orders,
                   Moment now) { rollouts.retryFailed(id, by, orders, isForced, now); });
}

}  // namespace fleet
