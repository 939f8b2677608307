/// The orders that an operator hands over for a roll-out.
#pragma once

#include <string>
#include <vector>

#include "fleet/server/rollouts/rollout_records.h"

namespace fleet {

/// One of them, read and checked.
struct IncomingOrder {
    std::string host;
    std::string order;  ///< its identifier
    std::string bytes;  ///< as signed
    std::string kind;
    std::string product;  ///< "" if its body names none
    std::string selector;
    std::string cancels;  ///< the order that it cancels; "" if it is of another kind
    Moment expires{};
};

/// A roll-out to more hosts is refused.
constexpr std::size_t kMostOrders = 100'000;

/// Reads orders, of which each must be signed by that operator, be for that fleet, still have time,
/// and be the only one for its host. What a host may refuse beyond that only the host knows. Throws
/// RolloutError, which names the order.
std::vector<IncomingOrder> readIncomingOrders(const std::vector<std::string>& orders,
                                              const RolloutOperator& by, const std::string& fleet,
                                              Moment now);

/// Whether an order does the roll-out's work; throws RolloutError if not.
void insistOnSameWork(const IncomingOrder& order, const Rollout& rollout);

}  // namespace fleet
