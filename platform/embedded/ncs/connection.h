/// A client's connection: an association and the socket that its bytes go through.
#pragma once

#include <atomic>
#include <cstdint>
#include <mutex>
#include <string>

#include "embedded/ncs_host.h"
#include "ncs/association.h"
#include "ncs/source.h"

namespace ncs {

/// Milliseconds of the monotonic clock.
using Milliseconds = std::int64_t;
constexpr Milliseconds kNever = INT64_MAX;
Milliseconds now();

/// Served by one thread at a time, except where said otherwise.
class Connection : public Source {
public:
    /// The socket is non-blocking.
    Connection(Descriptor socket, std::string port, SharedState& shared, const Limits& limits);
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    enum class Next { Read, Write, Close };
    /// Reads, calls and writes as long as the socket goes along, but not forever, and says what to
    /// wait for. Does not throw.
    Next serve();

    int socket() const { return socket_.get(); }
    /// When waiting for `next` has been long enough. Waiting for the rest of one request, or for
    /// the client to take one answer, is one wait however often some of it comes.
    Milliseconds deadlineFor(Next next);

    /// Held by the thread that serves the connection. Only one is woken at a time, so nobody waits
    /// here for longer than the other one needs to leave; the lock is what orders the two.
    std::mutex turn;

    /// When the connection is to be cut; kNever while it is served. For all threads.
    std::atomic<Milliseconds> deadline{kNever};

private:
    enum class Wait { Bind, Request, Answer, Idle };
    enum class Transfer { Done, Blocked, Failed };
    Next transfer();
    Transfer answer();
    Transfer flush();
    Transfer read(bool& drained);
    Milliseconds timeFor(Wait wait) const;

    const Descriptor socket_;
    const Limits& limits_;
    Association association_;
    std::size_t sent_ = 0;  ///< of the association's output

    Wait wait_ = Wait::Bind;
    std::uint64_t waitsSince_ = 0;  ///< the number of requests done when the wait began
    Milliseconds waitsUntil_;
};

}  // namespace ncs
