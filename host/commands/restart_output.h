/// The output of an install that may end the host: its script writes it to files of the depot, from
/// where it is taken instead.
#pragma once

#include "host/commands/command.h"

namespace host {

/// If the command is such an install, sets its outputs to the ends of those files. Files that
/// cannot be read leave them empty.
void addRestartOutput(Command& command);

}  // namespace host
