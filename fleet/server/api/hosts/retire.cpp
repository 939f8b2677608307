// POST /v1/hosts/{host}/retire: an admin says that a host will never come back.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/schema.h"
#include "fleet/server/keys/trust/revocations.h"

namespace fleet {

ApiEndpoint postRetire;
Schema retiredSchema;

namespace {

constexpr std::size_t kMostEnded = 1000;  ///< in one transaction

/// How its open orders ended, nobody will tell. Returns how many there were.
std::size_t endOrders(CentreDesk& desk, const std::string& host) {
    const auto open = desk.parts.store.open(host, 1, kHighestNumber, kMostEnded);
    for (const OpenOrder& order : open)
        desk.parts.centre.hear({host, order.number, order.order, "", kUnknown, ""});
    return open.size();
}

}  // namespace

http::Answer postRetire(Visit& visit, const Call& call) {
    if (!visit.isAdmin()) throw Forbidden("only an admin retires a host");
    ApiServices& services = visit.services;
    const std::string host = hostNamed(visit, *services.members(), call.required("host"));
    // In this order: whoever is interrupted can do it again, and a host that tells meanwhile how an
    // order ended is still heard.
    std::size_t ended = 0;
    for (std::size_t some = kMostEnded; some == kMostEnded; ended += some) {
        some = services.ask([host](CentreDesk& desk) { return endOrders(desk, host); });
    }
    services.withTrust([&](sqlite::Database& database) {
        return RevokedKeys(database).revokeHost(host, wallClock());
    });
    return http::jsonReply(200, textOf({{"host", host}, {"unknown", ended}}));
}

nlohmann::ordered_json retiredSchema(Components&) {
    return shape::object(
        "Retired", "A host that has left the fleet.",
        {{"host", shape::text("its bus key")},
         {"unknown", shape::wholeNumber("how many orders it had whose ends nobody will tell")}});
}

}  // namespace fleet
