// GET /v1/hosts/{host}

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/documents/host_sight.h"

namespace fleet {

ApiEndpoint getHost;

http::Answer getHost(Visit& visit, const Call& call) {
    const auto members = visit.services.members();
    const std::string host = hostNamed(visit, *members, call.required("host"));
    return http::jsonReply(
        200, textOf(hostDocument(sightsOf(visit, *members, {host}, WithFacts::Yes).front(),
                                 wallClock())));
}

}  // namespace fleet
