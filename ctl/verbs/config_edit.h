/// config edit: changes an agent's configuration in an editor.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/show/page.h"

namespace ctl {

/// What is said when the editor left the text as it was. `row` is the reply that held it.
Page showUnchanged(const std::string& product, const nlohmann::json& row, Format format);

}  // namespace ctl
