/// Signs anew what a roll-out wants: orders that have expired, that shall be tried again, or that
/// shall be cancelled.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>
#include <vector>

#include "fleet/operator/orders/order_maker.h"

namespace fleet {

/// What the other orders are for.
enum class Renewal {
    Resume,      ///< in the place of those that have expired
    Abort,       ///< to cancel those that were released
    RetryFailed  ///< for hosts that failed
};

/// As the centre's interface names it.
const char* nameOf(Renewal renewal);

/// Orders for what the centre lists as to be signed for the roll-out. The centre is not believed:
/// each order in the list must be one that this operator has made for this roll-out, or, if the
/// certificate allows this operator everything, one of another operator whom the root has
/// certified; it must be the roll-out's work, and nothing in it is changed but its identifier and
/// its times. Throws ctl::Failure otherwise;
/// then nothing is signed.
std::vector<std::string> renewedOrders(const nlohmann::json& toSign, const nlohmann::json& rollout,
                                       Renewal renewal, const OperatorIdentity& identity,
                                       const OrderMaker& maker);

}  // namespace fleet
