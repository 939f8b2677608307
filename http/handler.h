/// What a server needs from the application behind it.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "http/event_source.h"
#include "http/peer.h"
#include "http/reply.h"

namespace http {

class Responder;
struct Later;

/// How a request is answered: with a reply, with a stream of events, or some time later.
using Answer = std::variant<Reply, std::unique_ptr<EventSource>, Later>;

/// Makes an answer on a worker thread, where it may take as long as it needs.
using Job = std::function<Answer()>;

/// An answer that comes later, from any thread.
struct Later {
    /// Called once, on the I/O thread, so it must not block. Whoever keeps the responder answers
    /// with it.
    std::function<void(const Responder& responder)> begin;
    /// When this time is over, or the server is about to end, and no answer has come, this job
    /// makes the answer.
    std::chrono::milliseconds limit{0};
    std::function<Answer()> atLimit;
    /// Called on the I/O thread when the client closes its side before the answer has come, so that
    /// nobody waits for it any more; empty if that makes no difference. It may outlive the wait.
    std::function<void()> onGone{};
};

/// Gets a body piece by piece while it is read, so that it may be larger than what memory shall
/// hold. Everything but mostBytes() is called on worker threads, one call at a time, and may take
/// long. It is destroyed unasked when the client goes before its body is complete.
class BodyTaker {
public:
    virtual ~BodyTaker() = default;
    /// A body that is larger is refused with status 413. Any thread.
    virtual std::uint64_t mostBytes() const = 0;
    /// The next piece. A reply refuses the rest: it is sent, and the connection closed. What it
    /// throws becomes an answer with status 500.
    virtual std::optional<Reply> take(std::string_view piece) = 0;
    /// The body is complete. What it throws becomes an answer with status 500.
    virtual Answer answer() = 0;
};

/// What to do with a body that is yet to be read: nothing special, refuse it unread, or hand it
/// over piece by piece in place of Handler::handle().
using BodyPlan = std::variant<std::monostate, Reply, std::unique_ptr<BodyTaker>>;

/// One request, as it came. Method and target have not been checked.
struct Request {
    std::string method;
    std::string target;
    std::string body;
    Peer peer;
    std::string lastEventId{};    ///< the field of this name; empty if there is none
    std::string authorization{};  ///< likewise
    std::string range{};          ///< likewise
    /// The fields that Handler::wantedFields() names, each as often as it is there.
    Fields fields{};
};

/// The application behind a server. Everything is called on the I/O thread and must not block.
class Handler {
public:
    virtual ~Handler() = default;

    /// Either the answer, or the job that makes it. What it throws, or the job, becomes an answer
    /// with status 500.
    virtual std::variant<Answer, Job> handle(Request request) = 0;

    /// What to do with the body of a request whose head this is. Not asked about requests without
    /// one. What it throws becomes an answer with status 500.
    virtual BodyPlan planFor(const Request& head);

    /// The names of further header fields that requests are to hold. The same at all times.
    virtual const std::vector<std::string>& wantedFields() const;

    /// Fields of every answer, also of those that the server gives itself. An answer's own fields
    /// go before them. The same at all times.
    virtual const Fields& commonFields() const;

    /// The server ends: no request is handed on from now on.
    virtual void prepareForEnd() = 0;

    /// Whether nothing is under way that the end of the process would cut off.
    virtual bool quiet() const = 0;
};

}  // namespace http
