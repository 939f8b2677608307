/// TLS in front of a server that does not speak it.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>

#include "fleet/https/front/front_counts.h"
#include "fleet/https/front/front_limits.h"
#include "system/file_descriptor.h"

namespace fleet {

struct FrontSettings {
    std::string address;       ///< where to listen, see listenOn(): "" is everywhere
    std::uint16_t port = 0;    ///< 0 is any that is free
    std::string identityFile;  ///< certificates and key, see ServerIdentity; may change at any time
    FrontLimits limits{};
};

/// Listens on a TCP port. Whoever completes a handshake there reaches the server over a connected
/// Unix stream socket: what the client sends comes out of it in plain, and what is written to it
/// goes to the client. The server ends the connection by closing its end; how long a client may be
/// idle is the server's to decide.
///
/// A thread of its own does all the work, whatever the number of clients, so that one that is slow,
/// silent or broken holds up no other. It holds at most 16 KiB of each client's data each way, and
/// what the system does.
class TlsFront {
public:
    /// Gets the server's end of each connection. Called on the front's thread; must not block. What
    /// it throws costs that client its connection.
    using Take = std::function<void(sys::FileDescriptor connection)>;

    /// Serves from now on. Throws FrontError if the port or the file is not usable.
    TlsFront(const FrontSettings& settings, Take take);
    /// Closes what is still open.
    ~TlsFront();
    TlsFront(const TlsFront&) = delete;
    TlsFront& operator=(const TlsFront&) = delete;

    std::uint16_t port() const;
    /// As long as the front. Any thread.
    const FrontCounts& counts() const;

    /// Takes no client from now on, and returns when none is left: clients in a handshake lose
    /// their connections, and the others end with the server, which is to close its ends. What is
    /// open after `grace` is closed. Owner's thread, once.
    void end(std::chrono::milliseconds grace);

private:
    struct Implementation;
    const std::unique_ptr<Implementation> implementation_;
};

}  // namespace fleet
