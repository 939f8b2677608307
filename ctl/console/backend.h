/// What stands behind the console.
#pragma once

#include <variant>

#include "http/handler.h"

namespace console {

/// Answers what the page asks for: one host, or the centre of a fleet. The console has looked at
/// each request before it comes here: its own page has sent it, in its session. Everything is
/// called on the server's I/O thread and must not block.
class Backend {
public:
    virtual ~Backend() = default;

    /// The document that tells the page what it shows: GET /console/session.
    virtual std::variant<http::Answer, http::Job> describe() = 0;

    /// Every other request below /v1 and /console.
    virtual std::variant<http::Answer, http::Job> handle(http::Request request) = 0;

    /// What to do with the body of such a request; see http::Handler.
    virtual http::BodyPlan planFor(const http::Request& head) = 0;

    /// The server ends: no request comes from now on.
    virtual void prepareForEnd() = 0;

    /// Whether nothing is under way that changes something.
    virtual bool quiet() const = 0;
};

}  // namespace console
