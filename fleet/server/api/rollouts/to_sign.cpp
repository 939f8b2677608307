// GET /v1/rollouts/{id}/to-sign: the hosts for which an operator has to sign orders.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/trust/signed.h"
#include "fleet/server/api/documents/page.h"
#include "fleet/server/api/rollouts/own_rollout.h"
#include "fleet/server/api/schema.h"

using nlohmann::json;

namespace fleet {

ApiEndpoint getToSign;
Schema toSignSchema;

namespace {

/// Where a page ends, so that one of long orders is no longer than one of many.
constexpr std::size_t kPageBytes = std::size_t{512} << 10;

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
    const std::size_t most = pageSize(call, 200, 200);
    const auto orders = visit.services.ask([purpose, from, most, id = call.required("id"),
                                            isForced = call.flag("force")](CentreDesk& desk) {
        std::vector<HostToSign> hosts = hostsFor(purpose, id, isForced, desk);
        const std::size_t all = hosts.size();
        std::vector<OrderToSign> page;
        std::size_t bytes = 0;
        for (std::size_t i = from; i < all && page.size() < most && bytes < kPageBytes; ++i) {
            const auto record = desk.parts.store.host(hosts[i].host);
            page.push_back({hosts[i], record ? record->signing : std::string(),
                            orderBytes(desk, id, hosts[i])});
            bytes += page.back().bytes.size();
        }
        return std::pair{all, std::move(page)};
    });
    json document = {{"total", orders.first}, {"hosts", json::array()}};
    for (const OrderToSign& order : orders.second) {
        document["hosts"].push_back({{"host", order.host.host},
                                     {"signing", order.signing},
                                     {"order", order.host.order},
                                     {"end", order.host.end},
                                     {"tries", order.host.tries},
                                     {"signed", base64Of(order.bytes)}});
    }
    return http::jsonReply(200, textOf(document));
}

nlohmann::ordered_json toSignSchema(Components&) {
    const shape::Json host = shape::object(
        "HostToSign", "A host that needs another order.",
        {{"host", shape::text("its bus key")},
         {"signing", shape::text("the public key with which its link signs")},
         {"order", shape::text("the order that is replaced or cancelled")},
         {"end", shape::text("how that ended; empty before that")},
         {"tries", shape::wholeNumber("how many orders were signed for the host", 1)},
         {"signed", shape::text("that order, as its operator has signed it, in base64")}});
    return shape::object("HostsToSign", "Hosts for which an operator has to sign orders.",
                         {{"total", shape::wholeNumber("how many there are on all pages")},
                          {"hosts", shape::listOf("those of this page", host)}});
}

}  // namespace fleet
