/// What the host is at, in one line.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "host/outcomes/task.h"

namespace host {

/// "INSTALL ux": the command and the product in printable ASCII, each cut to 32 characters.
std::string wordsForTask(const Task& task);

/// "2 queued, 1 running: INSTALL ux" of so many tasks that have not begun and of those that run, or
/// "idle". The line holds printable ASCII only, whatever clients have asked for, and is short.
std::string taskStatus(std::int64_t queued, const std::vector<Task>& running);

}  // namespace host
