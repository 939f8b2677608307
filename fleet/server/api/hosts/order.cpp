// GET /v1/orders/{order}: what one order asked for, and of whom.

#include <algorithm>
#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/documents/order_document.h"
#include "fleet/server/api/schema.h"
#include "fleet/server/store/latest_orders.h"

namespace fleet {

ApiEndpoint getOrder;

http::Answer getOrder(Visit& visit, const Call& call) {
    const std::string& order = call.required("order");
    if (!isOrderId(order)) throw routes::BadRequest("\"" + order + "\" is no order's identifier");
    const auto records = visit.services.ask(
        [order](CentreDesk& desk) { return ordersNamed(desk.parts.database, order); });
    const auto members = visit.services.members();
    const auto seen = std::find_if(records.begin(), records.end(), [&](const OrderRecord& record) {
        const auto member = members->find(record.host);
        return member != members->end() && maySee(visit, member->second);
    });
    if (seen == records.end()) throw NothingThere("there is no order \"" + order + "\"");
    return http::jsonReply(200, textOf(orderDocument(*seen, visit.services.facts)));
}

}  // namespace fleet
