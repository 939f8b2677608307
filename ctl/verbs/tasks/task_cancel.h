/// task cancel: takes a task back, or ends it.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "ctl/show/page.h"

namespace ctl {

/// `record` is that of the task after all. One that ended otherwise than by being cancelled is a
/// failure.
Page showCancelled(const nlohmann::json& record, Format format);

}  // namespace ctl
