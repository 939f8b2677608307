/// Listening sockets.
#pragma once

#include <unistd.h>

#include <cstdint>
#include <string>
#include <utility>

#include "embedded/ncs_host.h"
#include "ncs/source.h"

namespace ncs {

/// Returns a system call's result, or throws std::system_error if the call failed.
int checked(int result, const char* what);

struct Listener : Source {
    /// Makes the listening socket non-blocking; it still belongs to the caller. `portText` is empty
    /// for a Unix socket. `admission` may be empty. Throws std::system_error.
    Listener(int listeningSocket, std::string portText, Admission admission);

    /// Sets up an accepted socket. Returns whether its peer may be served: where nobody else judges
    /// that, only the process's own user and root may.
    bool admits(int accepted) const;

    const int socket;
    const std::string port;
    const bool isUnix;
    const Admission judge;  ///< empty: the rule above
    bool paused = false;    ///< guarded by the server's lock
};

/// Makes a socket that listens on 127.0.0.1. If `port` is 0, it is set to a free port. Throws
/// std::system_error.
Descriptor loopbackSocket(std::uint16_t& port);

}  // namespace ncs
