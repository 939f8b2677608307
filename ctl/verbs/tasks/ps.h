/// ps: what the host works at, and what waits for it.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "ctl/show/page.h"
#include "ctl/show/time_text.h"

namespace ctl {

struct Invocation;

/// The tasks that run with their commands, and those that wait, a list, oldest first. Throws
/// Failure when the host does not list its tasks.
nlohmann::json askWork(const Invocation& invocation);
Page showWork(const nlohmann::json& tasks, WallTime now, Format format);

}  // namespace ctl
