// GET /v1/health

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/visit.h"

namespace fleet {

ApiEndpoint getCentreHealth;

http::Answer getCentreHealth(Visit& visit, const Call&) {
    return http::jsonReply(200,
                           textOf({{"program", "zavfleetd"},
                                   {"version", ZAV_VERSION},
                                   {"fleet", visit.services.facts.fleet},
                                   {"state", visit.services.isWorking() ? "working" : "waiting"}}));
}

}  // namespace fleet
