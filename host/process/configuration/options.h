/// The host's options, from wherever they come.
#pragma once

#include <optional>

#include "host/process/configuration/environment.h"
#include "host/process/configuration/host_options.h"

namespace host {

/// Reads the command line, takes what it leaves out from the configuration file that it names, and
/// then from the environment. Returns nothing after printing the help or the version. Throws
/// StartError for anything that makes no sense, with file and line if the file says it: in the
/// result the home is a directory, and both it and the state directory have absolute paths. Both
/// sockets have names.
std::optional<HostOptions> readOptions(int argc, const char* const* argv,
                                       const Environment& environment);

}  // namespace host
