/// Tasks in a table.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/show/time_text.h"

namespace ctl {

/// A line for each task of a list of summaries: identifier, state, command, when it was asked for,
/// how long it took or has taken, and the TRANSID if somebody has chosen it.
std::string taskTable(const nlohmann::json& tasks, WallTime now);

/// A task as its verb would call it: "start ux (deploy-7)".
std::string taskTitle(const nlohmann::json& record);

/// How long a task took from its acceptance to its end; zero if that is not known.
std::chrono::seconds timeTaken(const nlohmann::json& record);

}  // namespace ctl
