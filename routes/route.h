/// A route: everything that a program knows about one request of its interface, as one row of data.
/// Dispatching, checks of parameters and bodies, 405 with Allow, HEAD and OPTIONS all follow from
/// it, and so do the interface's description for machines and the documentation's check.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <utility>
#include <vector>

#include "http/handler.h"

namespace routes {

class Call;
class Components;

/// The shape of a document, for the interface's description; see routes/description/schema.h. What
/// it refers to it adds to the components.
using Schema = nlohmann::ordered_json(Components& components);

/// Where an endpoint runs.
enum class Runs {
    AtOnce,    ///< on the I/O thread: it only looks at what is in memory
    OnWorker,  ///< on a worker thread: it may take long, or run the plug-in's code
};

enum class Need { Optional, Required };

/// The type of a parameter of the path or of the query.
enum class Type {
    Text,
    Texts,   ///< text, and the parameter may be given several times
    Number,  ///< a whole number from 0 up, at most 18 digits
    Flag,    ///< 0 or 1
};

struct Parameter {
    const char* name;
    Type type;
    Need need;  ///< path parameters are always present
    const char* doc;
    Schema* schema = nullptr;  ///< for the description, if it can say more than the type
};

/// The JSON type of a member of the body.
enum class JsonType { String, Number, Boolean, Array, Object };

struct Member {
    const char* name;
    JsonType type;
    Need need;
    const char* doc;
    Schema* schema = nullptr;  ///< for the description, if it can say more than the type
};

/// One kind of event of a stream.
struct StreamEvent {
    const char* name;  ///< "message" stands for events without a name
    Schema* data;
};

/// What a request is answered with, if it is not answered with an error.
struct RouteAnswer {
    unsigned status;
    const char* doc;   ///< begins with a small letter, no full stop
    Schema* document;  ///< null: the answer is a stream of events, or else what `media` says
    std::vector<StreamEvent> events{};
    const char* media = "text/plain";
};

/// Whether a query may have parameters beyond those that the route names.
enum class Others {
    None,
    Columns,  ///< names of columns of a table, whose values they are to equal
};

/// A route without the function that answers: what can be known of it in advance.
struct RouteFacts {
    const char* method;  ///< with GET comes HEAD
    /// Segments between slashes. "{name}" stands for one segment that is not empty: the parameter
    /// of that name.
    const char* path;
    const char* doc;      ///< one line
    http::Access access;  ///< what a client must at least be allowed to do
    Runs runs;
    std::vector<RouteAnswer> answers{};
    std::vector<Parameter> parameters{};
    Others others = Others::None;
    std::vector<Member> body{};      ///< of a JSON object; empty: a body is not looked at
    std::vector<unsigned> errors{};  ///< statuses besides those that any request may get
};

/// A row of a program's route table. `Services` is what the program's endpoints work with.
template <typename Services>
struct Route : RouteFacts {
    /// Answers one request that fits its route. What it may throw, the program's handler says.
    using Endpoint = http::Answer(Services& services, const Call& call);

    Route(const char* wantedMethod, const char* wantedPath, const char* line,
          http::Access leastAccess, Runs where, Endpoint* function,
          std::vector<RouteAnswer> theAnswers = {}, std::vector<Parameter> theParameters = {},
          Others otherParameters = Others::None, std::vector<Member> members = {},
          std::vector<unsigned> furtherErrors = {})
        : RouteFacts{wantedMethod,
                     wantedPath,
                     line,
                     leastAccess,
                     where,
                     std::move(theAnswers),
                     std::move(theParameters),
                     otherParameters,
                     std::move(members),
                     std::move(furtherErrors)},
          endpoint(function) {}

    Endpoint* endpoint;
};

/// The rows without their functions, in their order.
template <typename Services>
std::vector<RouteFacts> factsOf(const std::vector<Route<Services>>& routes) {
    return {routes.begin(), routes.end()};
}

}  // namespace routes
