/// ps: what is at work on the host now.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "ctl/show/page.h"
#include "ctl/show/time_text.h"

namespace ctl {

struct Invocation;

/// The records of the tasks that run, a list, oldest first. Throws Failure when the host does not
/// list its tasks.
nlohmann::json askWork(const Invocation& invocation);
Page showWork(const nlohmann::json& tasks, WallTime now, Format format);

}  // namespace ctl
