/// agents: the products that are installed on the host.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "ctl/show/page.h"

namespace ctl {

struct Invocation;

/// Rows of the table KINAGT.
nlohmann::json askAgents(const Invocation& invocation);
Page showAgents(const nlohmann::json& rows, Format format);

}  // namespace ctl
