/// The options that were typed.
#pragma once

#include <optional>

#include "host/process/configuration/settings.h"

namespace host {

/// Nothing after printing the help or the version. Throws StartError for what is no option, and for
/// an option without its value. Values are not looked at.
std::optional<Settings> readCommandLine(int argc, const char* const* argv);

}  // namespace host
