/// The outcome of an install that restarts the host: it is asked for, not awaited as an event.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/client/deadline.h"
#include "ctl/client/tasks/task_request.h"

namespace ctl {

/// Whether the request is an install that restarts the host: its first outcome says only that it
/// has begun.
bool restartsHost(const TaskRequest& request);

/// The request for the outcome of the last such install.
TaskRequest completeInstallRequest(const std::string& transid);

/// Whether a reply to that request says that there is no outcome yet.
bool isNotThereYet(const nlohmann::json& row);

/// Asks twice a second until the host is there and knows the outcome. Returns the last reply when
/// the deadline passes before that; throws Failure(kNoOutcome) when there was none.
nlohmann::json fetchInstallOutcome(const std::string& socketPath, Deadline deadline,
                                   const Ticker& tick);

}  // namespace ctl
