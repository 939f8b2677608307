/// The RPC runtime as the host process sees it: where it listens and what limits it keeps.
///
/// It speaks connection-oriented DCE/RPC 5.0 without authentication. Unless a listener judges its
/// peers itself, it serves those that run as the process's own user or as root; TCP listens on
/// 127.0.0.1 only, and the kernel says who owns the other end. A call whose parameters are larger
/// than the limit (4 MiB) gets the fault nca_s_fault_remote_no_memory; other calls are not
/// affected.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

namespace ncs {

/// One complete call, as it came. Valid as long as the callback that gets it.
struct Call {
    std::uint64_t association = 0;        ///< of the client; a number is never used twice
    const char* interface = "";           ///< the name that it was registered with
    unsigned operation = 0;               ///< counted from 0
    const unsigned char* data = nullptr;  ///< the marshalled parameters; nothing is checked yet
    std::size_t length = 0;
    bool littleEndian = true;  ///< the caller's byte order
};

/// Sees every call before its stub does, and may answer in its place. Called on the server's
/// threads, several at a time, without a lock held; the calls of one association come one after the
/// other.
class CallWatch {
public:
    virtual ~CallWatch() = default;
    /// Comes before the stub. A text that it returns is the reply's marshalled data, of at most
    /// 4096 bytes: the stub is not called then. What it throws becomes a fault.
    virtual std::optional<std::string> before(const Call& call) = 0;
    /// Comes after a stub that was called. `reply` is its reply's data, empty when the call ended
    /// with a fault.
    virtual void after(const Call& call, const std::string& reply) noexcept = 0;
    /// An association that had made calls is over; none of its calls is running. Comes before its
    /// client sees the end of the connection.
    virtual void ended(std::uint64_t association) noexcept = 0;
};

struct Limits {
    unsigned workers = 8;                          ///< threads, and so calls that run at a time
    unsigned connections = 64;                     ///< further ones are closed at once
    std::size_t stubBytes = std::size_t{4} << 20;  ///< of one call's parameters
    std::size_t totalStubBytes = std::size_t{64} << 20;  ///< of all calls in progress
    std::chrono::milliseconds bindTime{10'000};          ///< from connecting to the bind
    std::chrono::milliseconds requestTime{60'000};  ///< from a request's first byte to its last
    std::chrono::milliseconds answerTime{30'000};   ///< for the client to receive an answer
    std::chrono::milliseconds idleTime{300'000};    ///< between requests
};

struct Counts {
    unsigned connections = 0;  ///< open now; everything else counts from the start
    std::uint64_t accepted = 0;
    std::uint64_t refused = 0;  ///< from users who are not served, or above the limit
    std::uint64_t timedOut = 0;
    std::uint64_t calls = 0;  ///< that reached a stub
    std::uint64_t faults = 0;
};

/// Whether the peer of an accepted Unix socket is served. Called on the server's threads, several
/// at a time, before anything is read; must not block.
using Admission = std::function<bool(int accepted)>;

/// Serves the interfaces that are registered with rpc__register_mgr, on threads of its own, which
/// block all signals. All operations are thread-safe. Without connections no thread wakes up.
class Server {
public:
    /// Starts the threads. `watch` outlives the server; null stands for none. Throws
    /// std::system_error.
    explicit Server(const Limits& limits = {}, CallWatch* watch = nullptr);
    /// Calls stop().
    ~Server();
    Server(const Server&) = delete;
    Server& operator=(const Server&) = delete;

    /// Accepts connections from a listening stream socket. The socket is made non-blocking; it
    /// still belongs to the caller, who closes it after stop(). The caller also sets the mode of a
    /// Unix socket's file. `admission` judges the peers; it is for Unix sockets only. Throws
    /// std::system_error.
    void listen(int socket, Admission admission = {});
    /// Listens on a TCP port of 127.0.0.1 and returns it; 0 stands for any free port. Throws
    /// std::system_error.
    std::uint16_t listenOnLoopback(std::uint16_t port);

    /// Lets running calls finish, refuses further ones and closes all connections. Returns when all
    /// threads have ended. May be called again, but not from a stub.
    void stop();

    Counts counts() const;

private:
    class Implementation;
    const std::unique_ptr<Implementation> implementation_;
};

}  // namespace ncs
