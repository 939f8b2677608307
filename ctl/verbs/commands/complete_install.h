/// complete-install: the outcome of an install that restarted the host.
#pragma once

#include <chrono>
#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/show/page.h"

namespace ctl {

/// How the install ended, by the reply `row`. `record` is what the host knows of the request, see
/// Task::record(): of a failure, its commands are shown. `title` names the command.
Page showFetchedOutcome(const std::string& title, const nlohmann::json& row,
                        const nlohmann::json& record, std::chrono::milliseconds elapsed,
                        Format format);

}  // namespace ctl
