/// Signed orders that come with a request, or came before it in a batch.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>
#include <vector>

#include "fleet/server/api/visit.h"
#include "fleet/server/rollouts/incoming_orders.h"

namespace fleet {

/// An array of orders in base64. Throws MessageError.
std::vector<std::string> ordersIn(const nlohmann::json& array);

/// The orders that the body's member "batch" or "orders" stands for; none without either. They are
/// signed by the visitor, and their files are here: what can be seen without the centre's thread
/// is no burden for it. Throws BadRequest, NothingThere and RolloutError.
std::vector<IncomingOrder> givenOrders(const Visit& visit, const Call& call);

/// Forgets the batch that the body names, if it names one.
void forgetBatch(const Visit& visit, const Call& call);

/// One change of an operator at a time: each may cost the centre's thread seconds.
class OneAtATime {
public:
    /// Throws BatchesFull if another one is under way.
    explicit OneAtATime(const Visit& visit);
    ~OneAtATime();
    OneAtATime(const OneAtATime&) = delete;
    OneAtATime& operator=(const OneAtATime&) = delete;

private:
    Batches& batches_;
    const std::string key_;
};

}  // namespace fleet
