// GET /v1/inventory: what is installed on the hosts, as they have told, and how old that is.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/documents/page.h"

using nlohmann::json;

namespace fleet {

ApiEndpoint getInventory;

namespace {

constexpr std::size_t kMostInventories = 100;
/// A page ends with the host whose facts reach this.
constexpr std::size_t kInventoryPageBytes = std::size_t{1024} * 1024;

std::size_t bytesOf(const HostSight& sight) {
    return sight.facts && sight.facts->facts.inventory
               ? sight.facts->facts.inventory->document.size()
               : 0;
}

}  // namespace

http::Answer getInventory(Visit& visit, const Call& call) {
    const std::string* const selector = call.text("selector");
    const std::string* const after = call.text("after");
    const std::size_t most = pageSize(call, kMostInventories, kMostInventories);
    const auto members = visit.services.members();
    std::vector<std::string> hosts = hostsMeant(visit, *members, selector ? *selector : "*",
                                                after ? *after : std::string(), most);
    bool isMore = hosts.size() > most;
    if (isMore) hosts.pop_back();
    json document = {{"hosts", json::array()}};
    std::size_t bytes = 0;
    std::string last;
    for (const HostSight& sight : sightsOf(visit, *members, hosts, WithFacts::Yes)) {
        if (bytes > kInventoryPageBytes) {
            isMore = true;
            break;
        }
        document["hosts"].push_back(hostDocument(sight, wallClock()));
        bytes += bytesOf(sight);
        last = sight.host;
    }
    if (isMore) document["next"] = last;
    return http::jsonReply(200, textOf(document));
}

}  // namespace fleet
