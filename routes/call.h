/// A request that fits its route, as its endpoint sees it.
#pragma once

#include <memory>
#include <nlohmann/json_fwd.hpp>
#include <string>
#include <utility>
#include <vector>

#include "routes/router.h"

namespace routes {

/// Immutable after readBody(); belongs to one request.
class Call {
public:
    Call(Match match, http::Request request)
        : match_(std::move(match)), request_(std::move(request)) {}

    /// Parses the body and checks it against the route's members, if it has any. Throws BadRequest.
    void readBody();

    const RouteFacts& route() const { return *match_.route; }
    /// The row's place in the table.
    std::size_t row() const { return match_.row; }
    const http::Peer& peer() const { return request_.peer; }
    /// The event after which a client that reads a stream wants to continue, from its field
    /// Last-Event-ID or else the parameter "after"; empty if it names none.
    std::string after() const;

    /// The value of a parameter of the path or of the query; null when it was not given.
    const std::string* text(const char* name) const;
    /// The values of a parameter of type Texts, in their order.
    std::vector<std::string> texts(const char* name) const;
    /// The value of a required parameter.
    const std::string& required(const char* name) const { return *text(name); }
    /// The value of a parameter of type Number; `otherwise` when it was not given.
    long long number(const char* name, long long otherwise) const;
    /// The value of a parameter of type Flag; false when it was not given.
    bool flag(const char* name) const;

    /// The parameters that name columns, in their order.
    const std::vector<std::pair<std::string, std::string>>& columns() const {
        return match_.others;
    }

    /// The field Authorization; empty if there is none.
    const std::string& authorization() const { return request_.authorization; }
    /// The field Range; empty if there is none.
    const std::string& range() const { return request_.range; }
    /// The body as it came, where the route describes none.
    const std::string& bytes() const { return request_.body; }

    /// The body, an object; only where the route describes it.
    const nlohmann::json& body() const { return *body_; }

private:
    const Match match_;
    http::Request request_;
    std::shared_ptr<const nlohmann::json> body_;
};

}  // namespace routes
