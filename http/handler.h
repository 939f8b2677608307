/// What a server needs from the application behind it.
#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <string>
#include <variant>

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
};

/// One request, as it came. Method and target have not been checked.
struct Request {
    std::string method;
    std::string target;
    std::string body;
    Peer peer;
    std::string lastEventId{};    ///< the field of this name; empty if there is none
    std::string authorization{};  ///< likewise
    std::string range{};          ///< likewise
};

/// The application behind a server. Everything is called on the I/O thread and must not block.
class Handler {
public:
    virtual ~Handler() = default;

    /// Either the answer, or the job that makes it. What it throws, or the job, becomes an answer
    /// with status 500.
    virtual std::variant<Answer, Job> handle(Request request) = 0;

    /// The server ends: no request is handed on from now on.
    virtual void prepareForEnd() = 0;

    /// Whether nothing is under way that the end of the process would cut off.
    virtual bool quiet() const = 0;
};

}  // namespace http
