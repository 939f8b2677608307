#include "fleet/server/store/latest_orders.h"

#include <cstdint>

#include "fleet/server/store/order_rows.h"

namespace fleet {

std::vector<OrderRecord> latestOrders(sqlite::Database& database, const std::string& host,
                                      std::size_t most) {
    std::vector<OrderRecord> orders;
    sqlite::Statement rows = database.ask(kLatest, host, static_cast<std::int64_t>(most));
    while (rows.step())
        orders.push_back(orderIn(rows));
    return orders;
}

std::vector<OrderRecord> ordersNamed(sqlite::Database& database, const std::string& order) {
    std::vector<OrderRecord> orders;
    sqlite::Statement rows = database.ask(kOrdersNamed, order);
    while (rows.step())
        orders.push_back(orderIn(rows));
    return orders;
}

}  // namespace fleet
