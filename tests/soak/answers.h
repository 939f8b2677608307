/// What the host's answers hold.
#pragma once

#include <nlohmann/json.hpp>
#include <string>

#include "soak/load/client.h"
#include "soak/load/http_text.h"

namespace soak {

/// The answer's document. Null when there is no answer or it says that the host is too busy, and
/// then, with a fault, when it is anything else than a success. `what` names the request.
nlohmann::json documentOf(World& world, const Answer* answer, const std::string& what);

/// The one row of an answer to a command; null like the above.
nlohmann::json rowOf(World& world, const Answer* answer, const std::string& what);

}  // namespace soak
