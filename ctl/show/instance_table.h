/// Instances of agents in a table.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

namespace ctl {

/// A line for each of listInstances() that runs or should; empty without any. Any member may be
/// missing.
std::string instanceTable(const nlohmann::json& instances);

}  // namespace ctl
