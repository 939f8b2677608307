// POST /v1/batches, POST /v1/batches/{batch}/orders: signed orders, before a roll-out takes them.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/rollouts/given_orders.h"
#include "fleet/server/api/schema.h"

namespace fleet {

ApiEndpoint postBatch, postBatchOrders;
Schema batchSchema, batchSizeSchema;

http::Answer postBatch(Visit& visit, const Call&) {
    return http::jsonReply(
        201, textOf({{"batch", visit.services.batches.open(visit.key, wallClock())}}));
}

http::Answer postBatchOrders(Visit& visit, const Call& call) {
    const auto total = visit.services.batches.add(visit.key, call.required("batch"),
                                                  ordersIn(call.body().at("orders")), wallClock());
    if (!total) throw NothingThere("there is no such batch; it may have been left for too long");
    return http::jsonReply(200, textOf({{"orders", *total}}));
}

nlohmann::ordered_json batchSchema(Components&) {
    return shape::object("Batch", "A place for signed orders.",
                         {{"batch", shape::text("its identifier")}});
}

nlohmann::ordered_json batchSizeSchema(Components&) {
    return shape::object("BatchSize", "How much is in a batch.",
                         {{"orders", shape::wholeNumber("how many orders")}});
}

}  // namespace fleet
