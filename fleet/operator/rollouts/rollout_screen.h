/// What somebody sees who waits for a roll-out.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/client/deadline.h"
#include "ctl/client/failure.h"
#include "ctl/show/page.h"
#include "fleet/operator/centre/centre.h"

namespace fleet {

/// Follows a roll-out to its end, with counts as they change and failures as they come, and shows
/// what it has come to. Ctrl-C says how to take it up again, and leaves the roll-out alone. For the
/// thread of main() alone. Throws ctl::Failure as followRollout() does.
ctl::ExitStatus watchRollout(Centre& centre, const std::string& id, ctl::Deadline deadline,
                             ctl::Format format);

}  // namespace fleet
