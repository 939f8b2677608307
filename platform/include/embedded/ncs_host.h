/// The RPC runtime seen from the process that it runs in: where it listens and what it allows.
///
/// It speaks connection-oriented DCE/RPC 5.0 without authentication. Unix sockets serve peers of
/// the process's own user and root; TCP serves whoever can connect, and only on 127.0.0.1. One
/// call's parameters may have 4 MiB; a larger call is answered with the fault
/// nca_s_fault_remote_no_memory and disturbs nobody.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>

namespace ncs {

struct Limits {
    unsigned workers = 8;                          ///< threads; as many calls run at a time
    unsigned connections = 64;                     ///< beyond them connections are closed at once
    std::size_t stubBytes = std::size_t{4} << 20;  ///< of one call's parameters
    std::size_t totalStubBytes = std::size_t{64} << 20;  ///< of all calls in progress
    std::chrono::milliseconds bindTime{10'000};          ///< from the connection to its bind
    std::chrono::milliseconds requestTime{60'000};  ///< from a request's first byte to its last
    std::chrono::milliseconds answerTime{30'000};   ///< for the client to take an answer
    std::chrono::milliseconds idleTime{300'000};    ///< between requests
};

struct Counts {
    unsigned connections = 0;  ///< now
    std::uint64_t accepted = 0;
    std::uint64_t refused = 0;  ///< of other users, or beyond the limit
    std::uint64_t timedOut = 0;
    std::uint64_t calls = 0;  ///< that reached a stub
    std::uint64_t faults = 0;
};

/// Serves the interfaces that are registered with rpc__register_mgr, on threads of its own which
/// block all signals. All operations are thread-safe. A process without connections is not woken.
class Server {
public:
    /// Starts the threads. Throws std::system_error.
    explicit Server(const Limits& limits = {});
    /// Stops.
    ~Server();
    Server(const Server&) = delete;
    Server& operator=(const Server&) = delete;

    /// Accepts connections of a listening stream socket, which becomes non-blocking and stays the
    /// caller's; it is closed after stop(). The mode of a Unix socket's file is the caller's
    /// affair. Throws std::system_error.
    void listen(int socket);
    /// Listens on a TCP port of 127.0.0.1, 0 for a free one; returns the port. Throws
    /// std::system_error.
    std::uint16_t listenOnLoopback(std::uint16_t port);

    /// Ends the calls that run, refuses more, closes all connections. Returns when no thread is
    /// left. May be called again; not by a stub.
    void stop();

    Counts counts() const;

private:
    class Implementation;
    const std::unique_ptr<Implementation> implementation_;
};

}  // namespace ncs
