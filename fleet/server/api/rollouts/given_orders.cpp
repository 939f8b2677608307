#include "fleet/server/api/rollouts/given_orders.h"

#include <memory>
#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "fleet/server/api/schema.h"

namespace fleet {
namespace {

using Orders = std::shared_ptr<const std::vector<std::string>>;

Orders ordersOf(const Visit& visit, const Call& call) {
    const nlohmann::json& body = call.body();
    const bool hasOrders = body.contains("orders");
    if (!body.contains("batch")) {
        return std::make_shared<const std::vector<std::string>>(
            hasOrders ? ordersIn(body.at("orders")) : std::vector<std::string>());
    }
    if (hasOrders) throw routes::BadRequest("either \"batch\" or \"orders\"");
    Orders found =
        visit.services.batches.find(visit.key, body.at("batch").get<std::string>(), wallClock());
    if (!found) throw NothingThere("there is no such batch; it may have been left for too long");
    return found;
}

/// Hosts would wait for files that nobody brings.
void insistOnFiles(ApiServices& services, const std::string& bytes) {
    for (const OrderFile& file : readOrder(bytes).order.files) {
        if (services.files.noteUse(file.sha256)) continue;
        throw routes::BadRequest("the file " + file.path + " is not at the centre; bring it first");
    }
}

}  // namespace

std::vector<std::string> ordersIn(const nlohmann::json& array) {
    std::vector<std::string> orders;
    orders.reserve(array.size());
    for (const auto& order : array) {
        if (!order.is_string()) throw MessageError("an order is a text, in base64");
        orders.push_back(bytesOfBase64(order.get_ref<const std::string&>()));
    }
    return orders;
}

std::vector<IncomingOrder> givenOrders(const Visit& visit, const Call& call) {
    const Orders orders = ordersOf(visit, call);
    try {
        std::vector<IncomingOrder> read = readIncomingOrders(
            *orders, visit.asOperator(), visit.services.facts.fleet, wallClock());
        for (const std::string& order : *orders)
            insistOnFiles(visit.services, order);
        return read;
    } catch (...) {
        // Nobody wants them again.
        forgetBatch(visit, call);
        throw;
    }
}

void forgetBatch(const Visit& visit, const Call& call) {
    if (!call.body().contains("batch")) return;
    visit.services.batches.forget(visit.key, call.body().at("batch").get<std::string>());
}

OneAtATime::OneAtATime(const Visit& visit) : batches_(visit.services.batches), key_(visit.key) {
    if (!batches_.beginChange(key_)) {
        throw BatchesFull("another change with your key is under way; try again in a moment");
    }
}

OneAtATime::~OneAtATime() {
    batches_.endChange(key_);
}

nlohmann::ordered_json ordersSchema(Components&) {
    nlohmann::ordered_json orders =
        shape::listOf("Orders for hosts.", shape::text("signed by who brings it, in base64"));
    orders["title"] = "Orders";
    return orders;
}

}  // namespace fleet
