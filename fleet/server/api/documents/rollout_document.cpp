#include "fleet/server/api/documents/rollout_document.h"

#include <nlohmann/json.hpp>

#include "fleet/server/api/documents/host_sight.h"

using nlohmann::json;

namespace fleet {
namespace {

json secondsOf(Moment time) {
    constexpr double kMilliseconds = 1000;
    return static_cast<double>(time.count()) / kMilliseconds;
}

json countsDocument(const RolloutCounts& counts) {
    json over = json::object();
    for (const auto& [state, hosts] : counts.over)
        over[state] = hosts;
    return {{"waiting", counts.waiting}, {"released", counts.released}, {"over", over}};
}

json planDocument(const RolloutPlan& plan) {
    json document = {
        {"waves", plan.waves}, {"maxFailures", plan.maxFailures}, {"pause", secondsOf(plan.pause)}};
    if (plan.wait) document["wait"] = secondsOf(*plan.wait);
    if (plan.parallel) document["parallel"] = *plan.parallel;
    return document;
}

}  // namespace

json rolloutDocument(const RolloutView& view) {
    const Rollout& rollout = view.rollout;
    const RolloutProgress& progress = view.progress;
    json waves = json::array();
    for (const RolloutCounts& wave : progress.waves)
        waves.push_back(countsDocument(wave));
    return {{"id", rollout.id},
            {"operator", rollout.by.name},
            {"kind", rollout.kind},
            {"product", rollout.product},
            {"selector", rollout.selector},
            {"created", timeOfDocument(rollout.created)},
            {"state", nameOf(rollout.state)},
            {"cause", nameOf(rollout.cause)},
            {"reason", rollout.reason},
            {"since", timeOfDocument(rollout.since)},
            {"plan", planDocument(rollout.plan)},
            {"hosts", rollout.hosts},
            {"mostFailures", rollout.mostFailures},
            {"wave", rollout.wave},
            {"waves", waves},
            {"counts", countsDocument(progress.all)},
            {"failures", progress.failures},
            {"away", progress.away},
            {"unconfirmed", progress.unconfirmed},
            {"expired", progress.expired}};
}

json partDocument(const PartView& view, const Members& members) {
    const Part& part = view.sight.part;
    const auto member = members.find(part.host);
    return {{"place", part.place},
            {"host", part.host},
            {"name", member == members.end() ? std::string() : member->second.name},
            {"wave", part.wave},
            {"order", part.order},
            {"number", part.number},
            {"tries", part.tries},
            {"state", nameOfState(part)},
            {"reason", part.reason},
            {"failure", part.failure != FailureState::None},
            {"away", view.isAway},
            {"unconfirmed", view.isUnconfirmed}};
}

}  // namespace fleet
