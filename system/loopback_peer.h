/// Who owns the other end of a TCP connection within this machine.
#pragma once

#include <sys/types.h>

#include <optional>

namespace sys {

/// Asks the kernel for the user whose process made the other end of an accepted connection on
/// 127.0.0.1. Nothing if the kernel does not say: a socket that its process has closed already
/// belongs to nobody, and neither does one of another network name space. Any thread.
std::optional<uid_t> ownerOfLoopbackPeer(int accepted);

}  // namespace sys
