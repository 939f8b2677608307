// POST /v1/rollouts

#include <cmath>
#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "fleet/server/api/documents/rollout_document.h"
#include "fleet/server/api/rollouts/given_orders.h"

using nlohmann::json;

namespace fleet {

ApiEndpoint postRollout;

namespace {

std::string textAt(const json& body, const char* member, const std::string& otherwise) {
    return body.contains(member) ? body.at(member).get<std::string>() : otherwise;
}

Moment secondsAt(const json& body, const char* member) {
    constexpr double kMilliseconds = 1000;
    const double given = body.at(member).get<double>() * kMilliseconds;
    // Whether it is too long for a roll-out, that says; here it must only fit.
    if (!(given >= 0 && given <= 2.0 * static_cast<double>(kLongestOrder.count()))) {
        throw routes::BadRequest(std::string("\"") + member + "\" is no such time");
    }
    return Moment(std::llround(given));
}

RolloutPlan planIn(const json& body) {
    RolloutPlan plan;
    plan.waves = textAt(body, "waves", plan.waves);
    plan.maxFailures = textAt(body, "maxFailures", plan.maxFailures);
    if (body.contains("pause")) plan.pause = secondsAt(body, "pause");
    if (body.contains("wait")) plan.wait = secondsAt(body, "wait");
    if (body.contains("parallel")) {
        const json& parallel = body.at("parallel");
        if (!parallel.is_number_unsigned() || parallel.get<std::uint64_t>() > kHighestNumber) {
            throw routes::BadRequest("\"parallel\" is not a whole number of hosts");
        }
        plan.parallel = parallel.get<std::size_t>();
    }
    return plan;
}

}  // namespace

http::Answer postRollout(Visit& visit, const Call& call) {
    const OneAtATime turn(visit);
    NewRollout wanted;
    wanted.id = textAt(call.body(), "id", "");
    wanted.by = visit.asOperator();
    wanted.plan = planIn(call.body());
    wanted.orders = givenOrders(visit, call);
    const RolloutView made = visit.services.ask([wanted = std::move(wanted)](CentreDesk& desk) {
        return desk.rollouts.show(desk.rollouts.create(wanted, desk.now), desk.now);
    });
    forgetBatch(visit, call);
    return http::jsonReply(201, textOf(rolloutDocument(made)));
}

}  // namespace fleet
