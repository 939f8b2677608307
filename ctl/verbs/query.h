/// query: the rows of a table.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "ctl/show/page.h"

namespace ctl {

struct Invocation;

nlohmann::json askQuery(const Invocation& invocation);
Page showQuery(const nlohmann::json& rows, Format format);

}  // namespace ctl
