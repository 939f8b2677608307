/// Where the host listens and how long it may take.
#pragma once

#include <chrono>
#include <string>

namespace ctl {

struct HostAddress {
    std::string socket;                 ///< the Unix socket for requests
    std::string rpcSocket;              ///< the Unix socket for file transfers
    std::chrono::milliseconds timeout;  ///< for one command as a whole
};

/// The socket of a host that nobody named: $ZAV_SOCKET, else zavhost.sock in $XDG_RUNTIME_DIR, else
/// in /run, where zavhost makes it if it is not told; and the service's if there is no such file.
std::string defaultSocket();

}  // namespace ctl
