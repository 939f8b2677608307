// GET /v1/hosts/{host}/orders: what a host was asked for, and how it ended.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/documents/order_document.h"
#include "fleet/server/api/documents/page.h"
#include "fleet/server/api/schema.h"
#include "fleet/server/store/latest_orders.h"

using nlohmann::json;

namespace fleet {

ApiEndpoint getHostOrders;
Schema hostOrdersSchema;

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

nlohmann::ordered_json hostOrdersSchema(Components& components) {
    return shape::object(
        "OrderList", "A host's latest orders.",
        {{"orders", shape::listOf("the newest first", components.ref(orderSchema))}});
}

}  // namespace fleet
