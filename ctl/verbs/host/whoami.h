/// whoami: who one is to the host.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "ctl/show/page.h"

namespace ctl {

/// The host's answer in words, or as it is. Throws Failure for what is no such answer.
Page showWhoami(const nlohmann::json& answer, Format format);

}  // namespace ctl
