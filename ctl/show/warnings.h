/// What the host found out beside the rows of a query.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/client/host_client.h"

namespace ctl {

/// {"rows": [...]}, with the answer's other members if there is something in them.
nlohmann::json answerDocument(const QueryAnswer& answer);

/// The commands that failed while the rows were collected, with their output, for standard error;
/// empty if there are none.
std::string warningsText(const nlohmann::json& warnings);

}  // namespace ctl
