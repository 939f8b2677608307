/// depot ls: what the depot holds.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/show/page.h"
#include "ctl/show/time_text.h"

namespace ctl {

/// Shows the document of GET /v1/depot: the names, or with `isLong` their types, sizes and times as
/// seen from `now`. Throws Failure when it is no such document.
Page showDepot(const nlohmann::json& listing, bool isLong, Format format, WallTime now);

}  // namespace ctl
