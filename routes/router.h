/// Finds the route of a request.
#pragma once

#include <cstddef>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "http/url.h"
#include "routes/route.h"

namespace routes {

/// A request's route and the values that it gives to the route's parameters.
struct Match {
    const RouteFacts* route = nullptr;  ///< the router's
    std::size_t row = 0;                ///< its place in the table
    std::string path;
    std::vector<std::pair<std::string, std::string>> parameters;  ///< those that the route names
    std::vector<std::pair<std::string, std::string>> others;      ///< in their order
};

/// Immutable; any thread.
class Router {
public:
    /// Throws std::logic_error when a row contradicts itself: a path that names a parameter which
    /// the row does not describe, two rows for the same request.
    /// `readersRefusal` is what somebody is told who may read and wants to change something.
    Router(std::vector<RouteFacts> routes, std::string readersRefusal);

    /// The route, or the reply that says why there is none: 400, 403, 404, 405, and the reply to
    /// OPTIONS. Looks at the method, the target and what the peer may do; not at the body.
    std::variant<Match, http::Reply> find(const http::Request& request) const;

    const std::vector<RouteFacts>& routes() const { return routes_; }

private:
    struct Entry {
        const RouteFacts* route;
        std::vector<std::string> segments;  ///< of its path
    };
    std::vector<const Entry*> atPath(const http::Target& target) const;

    const std::vector<RouteFacts> routes_;
    const std::string readersRefusal_;
    std::vector<Entry> entries_;
};

}  // namespace routes
