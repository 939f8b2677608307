/// rollout resume, abort, retry-failed: what needs orders that are signed anew.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/show/page.h"
#include "fleet/operator/centre/centre.h"
#include "fleet/operator/orders/renewed_orders.h"

namespace fleet {

/// What was done, for who asked.
struct RenewalResult {
    nlohmann::json rollout;  ///< as it is now
    std::size_t orders = 0;  ///< that were signed
    std::string note;        ///< what could not be done; "" if all was
};

/// Signs what the roll-out wants and hands it over. An abort first stops the release of orders, so
/// that it does so even when there is something about the orders to cancel. `isForced` tries again
/// also where nobody knows whether an order ran. Throws ctl::Failure.
RenewalResult renewRollout(Centre& centre, const std::string& id, Renewal renewal, bool isForced,
                           const OperatorIdentity& identity, const OrderMaker& maker);

ctl::Page showRenewal(const RenewalResult& result, Renewal renewal, ctl::Format format);

}  // namespace fleet
