#include "fleet/server/api/documents/rollout_document.h"

#include <initializer_list>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/schema.h"

using nlohmann::json;

namespace fleet {

Schema rolloutCountsSchema;

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

shape::Json planShape() {
    return shape::object(
        "Plan", "How the orders of a roll-out are released.",
        {{"waves", shape::text("such as 1,10%,100%")},
         {"maxFailures", shape::text("more of them pause it: a number, or a share")},
         {"pause", numberShape("seconds between two waves")},
         {"wait", numberShape("seconds after which a wave ends; not there: with its last host"),
          Need::Optional},
         {"parallel", shape::wholeNumber("hosts at a time; not there: all of a wave", 1),
          Need::Optional}});
}

template <typename Enumeration>
std::vector<std::string> namesOf(std::initializer_list<Enumeration> values) {
    std::vector<std::string> names;
    for (const Enumeration value : values)
        names.emplace_back(nameOf(value));
    return names;
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

nlohmann::ordered_json rolloutSchema(Components& components) {
    const auto time = [&](const char* doc) {
        return shape::about(doc, components.ref(timeSchema));
    };
    return shape::object(
        "Rollout", "One order for each of many hosts, a wave of them at a time.",
        {{"id", shape::text("its identifier")},
         {"operator", shape::text("the name of who made it")},
         {"kind", shape::text("the command of its orders")},
         {"product", shape::text("and the product")},
         {"selector", shape::text("the hosts that were meant")},
         {"created", time("when it was made")},
         {"state", shape::oneOf("finished: the last wave has ended; hosts that were away may "
                                "still carry their orders out",
                                namesOf({RolloutState::Running, RolloutState::Paused,
                                         RolloutState::Aborted, RolloutState::Finished}))},
         {"cause",
          shape::oneOf("why it is paused; empty if it is not",
                       namesOf({PauseCause::None, PauseCause::Operator, PauseCause::Failures,
                                PauseCause::Expiry, PauseCause::Restore}))},
         {"reason", shape::text("why it is paused or aborted, for people")},
         {"since", time("when it came into this state")},
         {"plan", planShape()},
         {"hosts", shape::wholeNumber("how many it has")},
         {"mostFailures", shape::wholeNumber("more of them pause it")},
         {"wave", shape::wholeNumber("the latest one that was released; 0: none yet")},
         {"waves", shape::listOf("how far each is, the first one first",
                                 components.ref(rolloutCountsSchema))},
         {"counts", shape::about("how far all of it is", components.ref(rolloutCountsSchema))},
         {"failures", shape::wholeNumber("that were seen and not tried again")},
         {"away", shape::wholeNumber("hosts that were released and are away")},
         {"unconfirmed", shape::wholeNumber("hosts whose orders have expired, which have not "
                                            "told so")},
         {"expired", shape::wholeNumber("hosts that wait with orders that have expired")}});
}

nlohmann::ordered_json partSchema(Components& components) {
    return shape::object(
        "Part", "A host's part in a roll-out.",
        {{"place", shape::wholeNumber("in the list of hosts, from 0")},
         {"host", shape::text("the host's bus key")},
         {"name", shape::text("the host's; empty if it has left the fleet")},
         {"wave", shape::wholeNumber("in which it is released, from 1", 1)},
         {"order", shape::text("the identifier of its latest order")},
         {"number", shape::wholeNumber("that order's number; 0 before it is released")},
         {"tries", shape::wholeNumber("how many orders were signed for it", 1)},
         {"state", components.ref(partStateSchema)},
         {"reason", shape::text("a few words about the end")},
         {"failure", shape::yesOrNo("whether it has failed")},
         {"away", shape::yesOrNo("whether it was released and the host is away")},
         {"unconfirmed", shape::yesOrNo("whether the order has expired and the host has not told "
                                        "so")}});
}

nlohmann::ordered_json rolloutCountsSchema(Components&) {
    shape::Json over = {{"type", "object"},
                        {"description", "hosts whose orders are over, by how they ended"}};
    over["additionalProperties"] = shape::wholeNumber("how many", 1);
    return shape::object("Counts", "How far some hosts of a roll-out are.",
                         {{"waiting", shape::wholeNumber("whose orders are not released")},
                          {"released", shape::wholeNumber("whose orders are, and not over")},
                          {"over", over}});
}

nlohmann::ordered_json partStateSchema(Components&) {
    shape::Json state = shape::text(
        "Waiting, released, or how the order ended, such as done, failed, refused, cancelled, "
        "expired or unknown.");
    state["title"] = "PartState";
    return state;
}

}  // namespace fleet
