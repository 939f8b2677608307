/// agents: what is installed on many hosts, as the centre knows it.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/show/page.h"

namespace fleet {

/// Of hosts' documents with their facts. Those that have never told an inventory are named, and
/// make it a failure; so do inventories that could not be taken in full. `product` is the only one
/// that is shown; "" shows all.
ctl::Page showFleetAgents(const nlohmann::json& hosts, const std::string& product,
                          ctl::Format format);

}  // namespace fleet
