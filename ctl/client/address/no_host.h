/// Why no host could be reached.
#pragma once

#include <string>

#include "ctl/client/failure.h"

namespace ctl {

/// The failure of a connection to the socket at `path`, with what to do about it: how to start a
/// host, or who may use the socket. `error` is an errno.
Failure noHost(const std::string& path, int error);

}  // namespace ctl
