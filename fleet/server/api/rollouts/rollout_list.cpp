// GET /v1/rollouts and GET /v1/rollouts/{id}

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/documents/page.h"
#include "fleet/server/api/documents/rollout_document.h"
#include "fleet/server/api/schema.h"

using nlohmann::json;

namespace fleet {

ApiEndpoint getRollouts, getRollout;
Schema rolloutListSchema;

http::Answer getRollouts(Visit& visit, const Call& call) {
    const std::string* const given = call.text("before");
    const std::string before = given ? *given : std::string();
    const std::size_t most = pageSize(call, 20, 100);
    const auto views = visit.services.ask(
        [before, most](CentreDesk& desk) { return desk.rollouts.list(before, most, desk.now); });
    json document = {{"rollouts", json::array()}};
    for (const RolloutView& view : views)
        document["rollouts"].push_back(rolloutDocument(view));
    return http::jsonReply(200, textOf(document));
}

http::Answer getRollout(Visit& visit, const Call& call) {
    const RolloutView view = visit.services.ask(
        [id = call.required("id")](CentreDesk& desk) { return desk.rollouts.show(id, desk.now); });
    return http::jsonReply(200, textOf(rolloutDocument(view)));
}

nlohmann::ordered_json rolloutListSchema(Components& components) {
    return shape::object(
        "RolloutList", "Roll-outs.",
        {{"rollouts", shape::listOf("the newest first", components.ref(rolloutSchema))}});
}

}  // namespace fleet
