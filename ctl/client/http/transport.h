/// A connection to the host's request socket. Only the HTTP client and the event stream include
/// this header: it brings in Boost.Asio.
#pragma once

#include <algorithm>
#include <boost/asio/io_context.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <chrono>
#include <cstddef>
#include <string>

#include "ctl/client/deadline.h"
#include "ctl/client/failure.h"

namespace ctl {

/// Bytes of an answer that are kept until they can be understood: a head, or the line before a
/// chunk. Without a limit a host could make them a line without end.
constexpr std::size_t kBufferBytes = 64UL * 1024;

/// A connected socket that runs one operation at a time, each until a deadline.
class Transport {
public:
    using Error = boost::system::error_code;
    using Socket = boost::asio::local::stream_protocol::socket;

    /// Throws Failure(kNoHost) when nobody listens on the path, or a user who is not trusted.
    explicit Transport(const std::string& path);

    /// Starts an asynchronous operation and waits for its end; `start` gets the handler to start it
    /// with. Returns false when the deadline passed first: the connection is closed then.
    template <typename Start>
    bool run(Deadline deadline, const Ticker& tick, Error& error, Start start);

    /// The same for an operation that must end in time: throws Failure(kNoOutcome) otherwise.
    template <typename Start>
    void runInTime(Deadline deadline, const Ticker& tick, Error& error, Start start) {
        if (!run(deadline, tick, error, start)) {
            throw Failure(kNoOutcome, "no answer within the time-out");
        }
    }

    Socket& socket() { return socket_; }

    /// What to throw when the connection failed.
    BrokenConnection broken(const Error& error) const;

private:
    void abandon();

    std::string path_;
    boost::asio::io_context context_;
    Socket socket_;
};

/// What to throw when the host answered with an HTTP status that is no success. `body` may hold the
/// reason as {"error": "...", "guard": "...", "hint": "..."}. A request that is wrong is the user's
/// to mend (kWrongUsage); one that the host does not want now is a failure (kHostReportedFailure).
/// What is no refusal either, such as a redirection, makes no sense of a host (kNoHost).
Failure refusal(unsigned status, const std::string& body);

// ---------------------------------------------------------------------------------------------

template <typename Start>
bool Transport::run(Deadline deadline, const Ticker& tick, Error& error, Start start) {
    bool ended = false;
    start([&](const Error& result, std::size_t) {
        error = result;
        ended = true;
    });
    context_.restart();
    while (!ended) {
        const auto now = std::chrono::steady_clock::now();
        if (now >= deadline) break;
        // An hour at a time: a far deadline must not overflow the clock's arithmetic.
        const auto pause = tick ? std::chrono::seconds(1) : std::chrono::seconds(3600);
        context_.run_for(std::min<std::chrono::nanoseconds>(pause, deadline - now));
        if (tick && !ended) tick();
        if (!ended) context_.restart();
    }
    if (ended) return true;
    abandon();
    return false;
}

}  // namespace ctl
