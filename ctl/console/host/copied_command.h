/// What a line that does the same at a terminal begins with.
#pragma once

#include <string>
#include <vector>

#include "ctl/verbs/arguments/values.h"

namespace console {

/// "zavctl" and the options that lead it to this host from any other terminal. A socket that the
/// environment names is among them.
std::vector<std::string> copiedCommand(const ctl::Values& given);

}  // namespace console
