/// What holds, and where it comes from.
#pragma once

#include <string>

#include "host/process/configuration/environment.h"
#include "host/process/configuration/host_options.h"
#include "host/process/configuration/settings.h"

namespace host {

/// All options that may stand in a configuration file, one a line, as such a file: the value that
/// holds, and where it comes from in a comment: "default", "environment, NAME", "FILE:LINE" or
/// "command line". An option without a value of its own is commented out.
std::string listOptions(const HostOptions& options, const Settings& settings,
                        const Environment& environment);

}  // namespace host
