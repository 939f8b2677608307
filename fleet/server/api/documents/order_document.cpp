#include "fleet/server/api/documents/order_document.h"

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/trust/signed.h"
#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/schema.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::size_t kMostOutcomeBytes = std::size_t{64} * 1024;

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

}  // namespace

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

nlohmann::ordered_json orderSchema(Components& components) {
    const shape::Json task = {
        {"type", {"object", "string"}},
        {"description",
         "what the host has told of its task: the task's document, as the host's "
         "own interface has it"}};
    return shape::object(
        "Order", "What a host was asked for.",
        {{"order", shape::text("the order's identifier")},
         {"host", shape::text("the host's bus key")},
         {"number", shape::wholeNumber("its place among all orders of the host; 0 if only the "
                                       "host's journal knows of it")},
         {"published", shape::yesOrNo("whether the bus has it")},
         {"state", components.ref(orderStateSchema)},
         {"kind", shape::text("the command"), Need::Optional},
         {"product", shape::text("the product's code"), Need::Optional},
         {"operator", shape::text("who has signed it"), Need::Optional},
         {"issued", shape::about("when", components.ref(timeSchema)), Need::Optional},
         {"expires",
          shape::about("until when the host may begin with it", components.ref(timeSchema)),
          Need::Optional},
         {"reason", shape::text("a few words about its end"), Need::Optional},
         {"outcome", task, Need::Optional}});
}

nlohmann::ordered_json orderStateSchema(Components&) {
    shape::Json state = shape::text(
        "Open, or how the order ended: the state in which the host's task ended, such as done, "
        "failed, refused, cancelled or expired; or unknown, if nobody can tell.");
    state["title"] = "OrderState";
    return state;
}

}  // namespace fleet
