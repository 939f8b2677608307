/// The description of the host's interface for machines: OpenAPI 3.1, made from the route table.
#pragma once

#include <string>
#include <vector>

#include "host/api/route.h"

namespace host {

/// The name of the route's operation, from its method and path: "getTasks" of GET /v1/tasks,
/// "getTask" of GET /v1/tasks/{id}, "postTaskCancel" of POST /v1/tasks/{id}/cancel.
std::string operationName(const Route& route);

/// The document, indented by two blanks and with a line feed at the end. Throws std::logic_error
/// when two schemas have one name, or a row says a status whose meaning is not known.
std::string describe(const std::vector<Route>& routes);

}  // namespace host
