/// The options that stand in a file.
#pragma once

#include <string>

#include "host/process/configuration/settings.h"

namespace host {

/// Reads a TOML file whose keys are the names of options. Throws StartError, which names the file
/// and the line, for what is not TOML, for unknown or repeated keys and for values of another kind
/// than the option's; also for a file that others could write, that is no plain file, or that
/// cannot be read.
Settings readConfigurationFile(const std::string& path);

}  // namespace host
