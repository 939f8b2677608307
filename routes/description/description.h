/// The description of an interface for machines: OpenAPI 3.1, made from the route table.
#pragma once

#include <string>
#include <vector>

#include "routes/route.h"

namespace routes {

/// What the status of an error means.
struct StatusMeaning {
    unsigned status;
    const char* when;       ///< begins with a small letter, no full stop
    bool ofEvery;           ///< any request may be answered with it
    bool saysWhen = false;  ///< Retry-After stands beside it
};

/// What is described, beside its routes.
struct Interface {
    const char* title;
    const char* version;
    const char* summary;
    const char* overview;
    const char* serverUrl;
    const char* serverDoc;
    const std::vector<StatusMeaning>& meanings;  ///< in the order of their numbers
    /// A status that only routes with a parameter or member of this name may give; "" and 0: none.
    const char* memberOfStatus = "";
    unsigned statusOfMember = 0;
    /// A status that all routes may give which not everybody may ask; 0: none.
    unsigned statusOfStrangers = 0;
};

/// The name of the route's operation, from its method and path: "getTasks" of GET /v1/tasks,
/// "getTask" of GET /v1/tasks/{id}, "postTaskCancel" of POST /v1/tasks/{id}/cancel,
/// "postTaskTryAgain" of POST /v1/tasks/{id}/try-again.
std::string operationName(const RouteFacts& route);

/// The document, indented by two blanks and with a line feed at the end. Throws std::logic_error
/// when two schemas have one name, or a row says a status whose meaning is not known.
std::string describe(const Interface& about, const std::vector<RouteFacts>& routes);

/// Of that document itself.
Schema descriptionSchema;

}  // namespace routes
