/// What hosts were asked for, for people.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "fleet/server/core/records.h"
#include "sqlite/database.h"

namespace fleet {

/// The host's orders with the highest numbers, descending. Throws sqlite::DatabaseError.
std::vector<OrderRecord> latestOrders(sqlite::Database& database, const std::string& host,
                                      std::size_t most);

/// The orders of that identifier: each host may have one, and but for a bad operator only one has.
/// Throws sqlite::DatabaseError.
std::vector<OrderRecord> ordersNamed(sqlite::Database& database, const std::string& order);

}  // namespace fleet
