/// version: of the program and of the host.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/show/page.h"

namespace ctl {

/// `health` is the host's health document; null when no host answers.
Page showVersion(const nlohmann::json& health, const std::string& socket, Format format);

}  // namespace ctl
