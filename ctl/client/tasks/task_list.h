/// The list of the host's tasks.
#pragma once

#include <cstddef>
#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/client/deadline.h"
#include "ctl/client/host_client.h"

namespace ctl {

/// What a task may be.
constexpr const char* kTaskStates[] = {"queued",  "running",   "done",    "failed",
                                       "refused", "cancelled", "expired", "interrupted"};

/// Which tasks are wanted. Empty texts mean any.
struct TaskFilter {
    std::string state;
    std::string product;
    std::size_t limit = 100;
};

/// The tasks, newest first, as {"tasks": [...], "next": cursor or null}. Asks page by page. Throws
/// Failure when the host does not list its tasks.
nlohmann::json listTasks(const HostClient& client, const TaskFilter& filter, Deadline deadline);

}  // namespace ctl
