/// tasks: what the host was asked for, and how it ended.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "ctl/show/page.h"
#include "ctl/show/time_text.h"

namespace ctl {

/// `list` is the host's document: the tasks, newest first, and whether there are more.
Page showTasks(const nlohmann::json& list, WallTime now, Format format);

}  // namespace ctl
