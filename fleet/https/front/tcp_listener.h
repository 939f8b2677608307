/// Listening for TCP connections.
#pragma once

#include <cstdint>
#include <string>

#include "system/file_descriptor.h"

namespace fleet {

/// A listening socket that does not block. `address` is an IP address of this machine; "::" takes
/// IPv4 as well, and "" stands for all addresses of both kinds that the machine has. Port 0 is any
/// that is free. Throws FrontError.
sys::FileDescriptor listenOn(const std::string& address, std::uint16_t port);

/// The port of a listening socket. Throws FrontError.
std::uint16_t portOf(const sys::FileDescriptor& listener);

/// A client's connection.
struct AcceptedClient {
    sys::FileDescriptor connection;  ///< does not block; none if nobody was there, see errno
    std::string origin;  ///< equal for clients from one IPv4 address or IPv6 network of 64 bits
};

/// The next client that waits at this listening socket. A client that has vanished from the network
/// ends the connection within minutes, whether or not anything is sent.
AcceptedClient acceptClient(int listener);

}  // namespace fleet
