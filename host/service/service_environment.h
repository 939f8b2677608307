/// What a service manager tells the host in environment variables.
#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <vector>

#include "host/process/configuration/environment.h"
#include "system/file_descriptor.h"

namespace host {

/// A listening socket that the service manager has made.
struct PassedSocket {
    sys::FileDescriptor descriptor;
    std::string name;  ///< as the service manager calls it; may be empty
    std::string path;  ///< of its file
};

struct ServiceEnvironment {
    std::string notifySocket{};                         ///< empty: nobody wants to be notified
    std::optional<std::chrono::microseconds> watchdog;  ///< how long the host may say nothing
    std::vector<PassedSocket> sockets{};
};

/// Reads NOTIFY_SOCKET, WATCHDOG_USEC and WATCHDOG_PID, LISTEN_FDS, LISTEN_PID and LISTEN_FDNAMES.
/// What is meant for another process is left out. Owns the passed descriptors from then on; they
/// are close-on-exec and non-blocking. Throws StartError for a passed descriptor that is no
/// listening Unix stream socket with a path, and for numbers that make no sense.
ServiceEnvironment readServiceEnvironment(const Environment& environment);

/// Removes all those variables, so that no child takes them for its own. Changes the process's
/// environment: call it while there is one thread.
void forgetServiceEnvironment();

/// Takes the socket with this path out of the list; nothing if it is not there. Throws StartError
/// if it has the name that stands for another role.
///
/// `role` is "http" or "rpc". Sockets with other names are known by their paths alone.
std::optional<PassedSocket> takeSocket(std::vector<PassedSocket>& sockets, const std::string& role,
                                       const std::string& path);

/// Throws StartError, which names the first of those that nobody has taken, if there are any.
void refuseSuperfluous(const std::vector<PassedSocket>& sockets);

}  // namespace host
