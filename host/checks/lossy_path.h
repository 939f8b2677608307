/// What letters outside ASCII do to a path in the plug-in's command lines.
#pragma once

#include <optional>
#include <string>

#include "host/checks/check.h"

namespace host {

/// An error if the path by itself loses bytes in the plug-in, in the code page of the process; a
/// warning if it would where it stands twice; nothing if it loses none.
std::optional<Finding> lossOf(const std::string& path);

}  // namespace host
