/// What the host keeps of a task, for people. Any member of a record may be missing.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/show/time_text.h"

namespace ctl {

/// A task that is at work or waits: what it is, since when, and a line for each of its processes.
std::string workText(const nlohmann::json& record, WallTime now);

/// All about a task: what it is, its times, how it ended and the commands that it ran.
std::string recordText(const nlohmann::json& record, WallTime now);

}  // namespace ctl
