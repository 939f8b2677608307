/// Signed orders that come with a request, or came before it in a batch.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>
#include <vector>

#include "fleet/server/api/visit.h"

namespace fleet {

/// An array of orders in base64. Throws MessageError.
std::vector<std::string> ordersIn(const nlohmann::json& array);

/// The orders that the body's member "batch" or "orders" stands for; none without either. Throws
/// BadRequest if both are there, or NothingThere.
std::vector<std::string> givenOrders(const Visit& visit, const Call& call);

}  // namespace fleet
