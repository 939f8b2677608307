/// task show: what became of a task.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "ctl/show/page.h"
#include "ctl/show/time_text.h"

namespace ctl {

/// `record` is what the host keeps of the task.
Page showRecord(const nlohmann::json& record, WallTime now, Format format);

}  // namespace ctl
