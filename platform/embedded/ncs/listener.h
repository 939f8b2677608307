/// The sockets at which clients arrive.
#pragma once

#include <unistd.h>

#include <cstdint>
#include <string>
#include <utility>

#include "ncs/source.h"

namespace ncs {

/// Passes on a system call's result; throws std::system_error if it failed.
int checked(int result, const char* what);

struct Listener : Source {
    /// Makes the listening socket non-blocking; it stays the caller's. `portText` is empty for a
    /// Unix socket. Throws std::system_error.
    Listener(int listeningSocket, std::string portText);

    /// Whether the peer of an accepted socket may be served: of a Unix socket's peers those of the
    /// process's own user and root. Prepares the socket as well.
    bool admits(int accepted) const;

    const int socket;
    const std::string port;
    const bool isUnix;
    bool paused = false;  ///< guarded by the server's lock
};

/// A socket that listens on 127.0.0.1. With port 0 a free one is taken and put into `port`. Throws
/// std::system_error.
Descriptor loopbackSocket(std::uint16_t& port);

}  // namespace ncs
