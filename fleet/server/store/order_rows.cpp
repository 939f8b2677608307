#include "fleet/server/store/order_rows.h"

namespace fleet {

OrderRecord orderIn(const sqlite::Statement& row) {
    OrderRecord order;
    order.host = row.bytes(0);
    order.number = static_cast<Number>(row.integer(1));
    order.order = row.bytes(2);
    order.bytes = row.bytes(3);
    order.isPublished = row.integer(4) != 0;
    if (row.isNull(5)) return order;
    order.outcome = Outcome{order.host,   static_cast<Number>(row.integer(6)),
                            order.order,  row.bytes(7),
                            row.bytes(5), row.bytes(8)};
    return order;
}

}  // namespace fleet
