// GET /v1/health

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/schema.h"
#include "fleet/server/api/visit.h"

namespace fleet {

ApiEndpoint getCentreHealth;
Schema centreHealthSchema;

http::Answer getCentreHealth(Visit& visit, const Call&) {
    return http::jsonReply(200,
                           textOf({{"program", "zavfleetd"},
                                   {"version", ZAV_VERSION},
                                   {"fleet", visit.services.facts.fleet},
                                   {"state", visit.services.isWorking() ? "working" : "waiting"}}));
}

nlohmann::ordered_json centreHealthSchema(Components&) {
    return shape::object(
        "Health", "What the centre says about itself.",
        {{"program", shape::text("zavfleetd")},
         {"version", shape::text("the product's version")},
         {"fleet", shape::text("the fleet's name")},
         {"state", shape::oneOf("waiting for the bus, or for another centre to end; or not",
                                {"working", "waiting"})}});
}

}  // namespace fleet
