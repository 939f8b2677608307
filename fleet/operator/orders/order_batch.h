/// Takes signed orders to the centre, a few hundred at a time.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "fleet/operator/centre/centre.h"

namespace fleet {

/// Called when so many of the orders are there.
using OnSent = std::function<void(std::size_t orders)>;

/// Has the centre keep the orders until a roll-out takes them. Returns the batch's name. Throws
/// ctl::Failure; nothing is carried out then.
std::string sendOrders(Centre& centre, const std::vector<std::string>& orders,
                       const OnSent& onSent = {});

}  // namespace fleet
