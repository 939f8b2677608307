// GET /v1/rollouts/{id}/hosts and GET /v1/rollouts/{id}/failures

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/documents/page.h"
#include "fleet/server/api/documents/rollout_document.h"
#include "fleet/server/api/schema.h"

using nlohmann::json;

namespace fleet {

ApiEndpoint getRolloutHosts, getRolloutFailures;
Schema partListSchema;

namespace {

constexpr std::size_t kUsualParts = 100;
constexpr std::size_t kMostParts = 1000;

/// Without those that the visitor may not see.
http::Reply partsReply(const Visit& visit, const std::vector<PartView>& views) {
    const auto members = visit.services.members();
    const bool seesAll = visit.grant.selector == "*";
    json document = {{"hosts", json::array()}};
    for (const PartView& view : views) {
        const auto member = members->find(view.sight.part.host);
        const bool isVisible =
            seesAll || (member != members->end() && maySee(visit, member->second));
        if (isVisible) document["hosts"].push_back(partDocument(view, *members));
    }
    return http::jsonReply(200, textOf(document));
}

}  // namespace

http::Answer getRolloutHosts(Visit& visit, const Call& call) {
    const auto from = static_cast<std::size_t>(call.number("from", 0));
    const std::size_t most = pageSize(call, kUsualParts, kMostParts);
    return partsReply(visit,
                      visit.services.ask([id = call.required("id"), from, most](CentreDesk& desk) {
                          return desk.rollouts.parts(id, from, most, desk.now);
                      }));
}

http::Answer getRolloutFailures(Visit& visit, const Call& call) {
    const std::size_t most = pageSize(call, kUsualParts, kMostParts);
    return partsReply(visit, visit.services.ask([id = call.required("id"), most](CentreDesk& desk) {
        std::vector<PartView> views;
        for (const Part& part : desk.rollouts.failures(id, most))
            views.push_back(viewOf(PartSight{part, desk.now, {}}, desk.now));
        return views;
    }));
}

nlohmann::ordered_json partListSchema(Components& components) {
    return shape::object(
        "PartList", "Hosts of a roll-out, without those that the operator may not see.",
        {{"hosts", shape::listOf("their parts in it", components.ref(partSchema))}});
}

}  // namespace fleet
