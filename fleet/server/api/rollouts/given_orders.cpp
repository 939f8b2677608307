#include "fleet/server/api/rollouts/given_orders.h"

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"

namespace fleet {

std::vector<std::string> ordersIn(const nlohmann::json& array) {
    std::vector<std::string> orders;
    orders.reserve(array.size());
    for (const auto& order : array) {
        if (!order.is_string()) throw MessageError("an order is a text, in base64");
        orders.push_back(bytesOfBase64(order.get_ref<const std::string&>()));
    }
    return orders;
}

std::vector<std::string> givenOrders(const Visit& visit, const Call& call) {
    const nlohmann::json& body = call.body();
    const bool hasOrders = body.contains("orders");
    if (!body.contains("batch")) {
        return hasOrders ? ordersIn(body.at("orders")) : std::vector<std::string>();
    }
    if (hasOrders) throw routes::BadRequest("either \"batch\" or \"orders\"");
    const auto found = visit.services.batches.find(visit.key, body.at("batch").get<std::string>(),
                                                   ApiServices::now());
    if (!found) throw NothingThere("there is no such batch; it may have been left for too long");
    return *found;
}

}  // namespace fleet
