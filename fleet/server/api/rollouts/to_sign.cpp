// GET /v1/rollouts/{id}/to-sign: the hosts for which an operator has to sign orders.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/trust/signed.h"
#include "fleet/server/api/documents/page.h"
#include "fleet/server/api/rollouts/own_rollout.h"

using nlohmann::json;

namespace fleet {

ApiEndpoint getToSign;

namespace {

struct OrderToSign {
    HostToSign host;
    std::string signing;  ///< the host's key
    std::string bytes;    ///< the order that is replaced or cancelled
};

std::vector<HostToSign> hostsFor(const std::string& purpose, const std::string& id, bool isForced,
                                 CentreDesk& desk) {
    if (purpose == "resume") return desk.rollouts.toSignAnew(id, desk.now);
    if (purpose == "abort") return desk.rollouts.toCancel(id);
    return desk.rollouts.toTryAgain(id, isForced);
}

/// As its operator has signed it: the roll-out's while it waits, then the centre's.
std::string orderBytes(CentreDesk& desk, const std::string& id, const HostToSign& host) {
    const auto given = desk.parts.store.order(host.host, host.order);
    if (given) {
        const auto numbered = partsOf(given->bytes);
        return numbered ? std::string(numbered->carried) : std::string();
    }
    const auto rollout = desk.rolloutStore.rollout(id);
    const auto part = rollout ? desk.rolloutStore.part(rollout->row, host.host) : std::nullopt;
    return part && part->state == PartState::Waiting ? desk.rolloutStore.bytesOf(*part) : "";
}

}  // namespace

http::Answer getToSign(Visit& visit, const Call& call) {
    insistOnOwn(visit, call.required("id"));
    const std::string purpose = call.required("for");
    if (purpose != "resume" && purpose != "abort" && purpose != "retry-failed") {
        throw routes::BadRequest("\"for\" is not resume, abort or retry-failed");
    }
    const auto from = static_cast<std::size_t>(call.number("from", 0));
    // An answer of at most some 500 KiB.
    const std::size_t most = pageSize(call, 200, 200);
    const auto orders = visit.services.ask([purpose, from, most, id = call.required("id"),
                                            isForced = call.flag("force")](CentreDesk& desk) {
        std::vector<HostToSign> hosts = hostsFor(purpose, id, isForced, desk);
        const std::size_t all = hosts.size();
        std::vector<OrderToSign> page;
        for (std::size_t i = from; i < all && page.size() < most; ++i) {
            const auto record = desk.parts.store.host(hosts[i].host);
            page.push_back({hosts[i], record ? record->signing : std::string(),
                            orderBytes(desk, id, hosts[i])});
        }
        return std::pair{all, page};
    });
    json document = {{"total", orders.first}, {"hosts", json::array()}};
    for (const OrderToSign& order : orders.second) {
        document["hosts"].push_back({{"host", order.host.host},
                                     {"signing", order.signing},
                                     {"order", order.host.order},
                                     {"end", order.host.end},
                                     {"signed", base64Of(order.bytes)}});
    }
    return http::jsonReply(200, textOf(document));
}

}  // namespace fleet
