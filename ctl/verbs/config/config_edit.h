/// config edit: changes an agent's configuration in an editor.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/show/page.h"

namespace ctl {

/// The output when the editor changed nothing. `row` is the reply with the text.
Page showUnchanged(const std::string& product, const nlohmann::json& row, Format format);

}  // namespace ctl
