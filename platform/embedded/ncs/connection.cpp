#include "ncs/connection.h"

#include <sys/socket.h>
#include <sys/uio.h>

#include <cerrno>
#include <chrono>
#include <exception>
#include <utility>

namespace ncs {
namespace {

/// After so many reads other connections get their turn.
constexpr int kReadsInARow = 64;

}  // namespace

Milliseconds now() {
    return std::chrono::duration_cast<std::chrono::milliseconds>(
               std::chrono::steady_clock::now().time_since_epoch())
        .count();
}

Connection::Connection(Descriptor socket, std::string port, SharedState& shared,
                       const Limits& limits)
    : Source(Kind::Connection),
      socket_(std::move(socket)),
      limits_(limits),
      association_(shared, std::move(port)),
      waitsUntil_(now() + limits.bindTime.count()) {}

Connection::Next Connection::serve() {
    try {
        return transfer();
    } catch (const std::exception&) {
        return Next::Close;  // no memory for the answer
    }
}

Connection::Next Connection::transfer() {
    bool drained = false;
    for (int reads = 0;; ++reads) {
        const Transfer answered = answer();
        if (answered == Transfer::Blocked) return Next::Write;
        if (answered == Transfer::Failed || !association_.isOpen()) return Next::Close;
        if (drained || reads == kReadsInARow) return Next::Read;
        const Transfer got = read(drained);
        if (got == Transfer::Blocked) return Next::Read;
        if (got == Transfer::Failed) return Next::Close;
    }
}

/// Sends pending output and handles requests that had to wait for that.
Connection::Transfer Connection::answer() {
    do {
        const Transfer sent = flush();
        if (sent != Transfer::Done) return sent;
        association_.handle();
    } while (!association_.output().empty());
    return Transfer::Done;
}

Connection::Transfer Connection::flush() {
    std::string& output = association_.output();
    while (sent_ < output.size()) {
        const ssize_t count =
            ::send(socket_.get(), output.data() + sent_, output.size() - sent_, MSG_NOSIGNAL);
        if (count >= 0) {
            sent_ += static_cast<std::size_t>(count);
        } else if (errno == EAGAIN || errno == EWOULDBLOCK) {
            return Transfer::Blocked;
        } else if (errno != EINTR) {
            return Transfer::Failed;
        }
    }
    output.clear();
    sent_ = 0;
    return Transfer::Done;
}

/// Reads once. Sets `drained` if that was less than there was room for.
Connection::Transfer Connection::read(bool& drained) {
    iovec ranges[2];
    const int count = association_.windows(ranges);
    std::size_t room = 0;
    for (int i = 0; i < count; ++i)
        room += ranges[i].iov_len;
    ssize_t got = 0;
    do {
        got = ::readv(socket_.get(), ranges, count);
    } while (got == -1 && errno == EINTR);
    if (got == -1 && (errno == EAGAIN || errno == EWOULDBLOCK)) return Transfer::Blocked;
    if (got <= 0) return Transfer::Failed;
    association_.received(static_cast<std::size_t>(got));
    drained = static_cast<std::size_t>(got) < room;
    return Transfer::Done;
}

Milliseconds Connection::timeFor(Wait wait) const {
    switch (wait) {
        case Wait::Bind:
            return limits_.bindTime.count();
        case Wait::Request:
            return limits_.requestTime.count();
        case Wait::Answer:
            return limits_.answerTime.count();
        case Wait::Idle:
            break;
    }
    return limits_.idleTime.count();
}

Milliseconds Connection::deadlineFor(Next next) {
    Wait wait = Wait::Idle;
    if (next == Next::Write) {
        wait = Wait::Answer;
    } else if (!association_.isBound()) {
        wait = Wait::Bind;
    } else if (association_.isMidRequest()) {
        wait = Wait::Request;
    }
    const std::uint64_t done = association_.requestsDone();
    const bool isSameWait = wait == wait_ && waitsSince_ == done && wait != Wait::Idle;
    if (!isSameWait) waitsUntil_ = now() + timeFor(wait);
    wait_ = wait;
    waitsSince_ = done;
    return waitsUntil_;
}

}  // namespace ncs
