/// What the command line says apart from the command itself.
#pragma once

#include <chrono>
#include <optional>
#include <string>

namespace ctl {

struct Options {
    std::string socket;                    ///< the host's request socket
    std::string rpcSocket;                 ///< the host's file transfer socket
    bool json = false;                     ///< one JSON document instead of text
    std::optional<double> timeoutSeconds;  ///< as given; see timeout()

    /// How long a command may take. The default leaves room for a stop and a start that each use
    /// up the host's own time-out of 300 seconds.
    std::chrono::milliseconds timeout() const {
        const double seconds = timeoutSeconds.value_or(660.0);
        return std::chrono::milliseconds(static_cast<long long>(seconds * 1000.0));
    }
};

/// The host's default socket: $ZAV_SOCKET, else zavhost.sock in $XDG_RUNTIME_DIR, else in /run.
std::string defaultSocket();

}  // namespace ctl
