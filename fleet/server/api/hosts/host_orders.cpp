// GET /v1/hosts/{host}/orders: what a host was asked for, and how it ended.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/trust/signed.h"
#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/documents/page.h"
#include "fleet/server/store/latest_orders.h"

using nlohmann::json;

namespace fleet {

ApiEndpoint getHostOrders;

namespace {

constexpr std::size_t kMostOutcomeBytes = 64 * 1024;

/// What the operator has signed, within what the centre has.
void addSigned(json& document, const OrderRecord& record, const FleetFacts& facts) {
    const auto numbered = partsOf(record.bytes);
    if (!numbered) return;  // only the host's journal knows of it
    const SignedOrder order = readOrder(numbered->carried);
    document["kind"] = order.order.kind;
    document["issued"] = timeOfDocument(order.order.issued);
    document["expires"] = timeOfDocument(order.order.expires);
    document["operator"] = readCertificate(order.certificate, facts.root, facts.fleet).name;
    const json body = json::parse(order.order.body, nullptr, false);
    if (body.is_object() && body.contains("product")) document["product"] = body["product"];
}

json orderDocument(const OrderRecord& record, const FleetFacts& facts) {
    json document = {{"order", record.order},
                     {"host", record.host},
                     {"number", record.number},
                     {"published", record.isPublished},
                     {"state", record.outcome ? record.outcome->state : "open"}};
    try {
        addSigned(document, record, facts);
    } catch (const MessageError&) {
        // An older centre may have taken what this one would not.
    }
    if (record.outcome && record.outcome->task.size() > kMostOutcomeBytes) {
        document["reason"] = "its outcome is too long to be shown in a list";
    } else if (record.outcome && !record.outcome->task.empty()) {
        const json task = json::parse(record.outcome->task, nullptr, false);
        document["outcome"] = task.is_discarded() ? json(record.outcome->task) : task;
        if (task.is_object() && task.contains("reason") && task["reason"].is_string()) {
            document["reason"] = task["reason"];
        }
    }
    return document;
}

}  // namespace

http::Answer getHostOrders(Visit& visit, const Call& call) {
    const std::string host = hostNamed(visit, *visit.services.members(), call.required("host"));
    const std::size_t most = pageSize(call, 20, 100);
    const auto records = visit.services.ask(
        [host, most](CentreDesk& desk) { return latestOrders(desk.parts.database, host, most); });
    json document = {{"orders", json::array()}};
    for (const OrderRecord& record : records)
        document["orders"].push_back(orderDocument(record, visit.services.facts));
    return http::jsonReply(200, textOf(document));
}

}  // namespace fleet
