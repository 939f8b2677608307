/// A client's connection: an association and its socket.
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

/// Used by one thread at a time, except where noted.
class Connection : public Source {
public:
    /// `socket` must be non-blocking.
    Connection(Descriptor socket, std::string port, SharedState& shared, const Limits& limits);
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    enum class Next { Read, Write, Close };
    /// Reads, makes calls and writes until the socket would block, or for a bounded number of reads
    /// so that other connections get their turn. Returns what to wait for. Does not throw.
    Next serve();

    int socket() const { return socket_.get(); }
    /// The time at which waiting for `next` ends. Waiting for the rest of one request, or for the
    /// client to receive one answer, counts as one wait even if it proceeds in small steps.
    Milliseconds deadlineFor(Next next);

    /// Held by the thread that serves the connection. Only one thread is woken at a time, so the
    /// next one waits at most until the previous one has left. The lock orders the two.
    std::mutex turn;

    /// When the connection is to be closed; kNever while it is served. Any thread.
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
    std::uint64_t waitsSince_ = 0;  ///< requestsDone() when the wait began
    Milliseconds waitsUntil_;
};

}  // namespace ncs
