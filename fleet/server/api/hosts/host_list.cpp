// GET /v1/hosts

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/documents/page.h"
#include "fleet/server/api/schema.h"

using nlohmann::json;

namespace fleet {

ApiEndpoint getHosts;
Schema hostListSchema;

http::Answer getHosts(Visit& visit, const Call& call) {
    const std::string* const selector = call.text("selector");
    const std::string* const after = call.text("after");
    const std::size_t most = pageSize(call, 100, 1000);
    const auto members = visit.services.members();
    std::vector<std::string> hosts = hostsMeant(visit, *members, selector ? *selector : "*",
                                                after ? *after : std::string(), most);
    json document = {{"hosts", json::array()}};
    if (hosts.size() > most) {
        hosts.pop_back();
        document["next"] = hosts.back();
    }
    for (const HostSight& sight : sightsOf(visit, *members, hosts))
        document["hosts"].push_back(hostDocument(sight, wallClock()));
    return http::jsonReply(200, textOf(document));
}

nlohmann::ordered_json hostListSchema(Components& components) {
    return shape::object(
        "HostList", "Hosts, in the order of their keys.",
        {{"hosts", shape::listOf("those that the operator may see", components.ref(hostSchema))},
         {"next", shape::text("what to give as \"after\" for the next page; not there at the end"),
          Need::Optional}});
}

}  // namespace fleet
