/// depot sum: the checksums of files in the depot.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "ctl/show/page.h"

namespace ctl {

/// Shows the rows of GET /v1/depot/sum as sha256sum does; what has no sum is a complaint and makes
/// the page's status that of a failure.
Page showSums(const nlohmann::json& rows, Format format);

}  // namespace ctl
