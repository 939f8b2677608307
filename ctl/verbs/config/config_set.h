/// config set: replaces an agent's configuration.
#pragma once

#include <string>

#include "ctl/client/tasks/task_request.h"

namespace ctl {

/// The request that replaces a configuration. Throws Failure(kWrongUsage) when the text is empty.
/// Prints a note for the universal agent, whose configuration is no text.
TaskRequest configurationRequest(const std::string& product, const std::string& target,
                                 const std::string& text);

}  // namespace ctl
