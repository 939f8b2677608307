/// doctor: what the checks of many hosts find.
#pragma once

#include <vector>

#include "ctl/show/page.h"
#include "fleet/operator/questions/asked_hosts.h"

namespace fleet {

/// The hosts that are worst first, with the checks that are not in order, the worst of them first;
/// then a line for all hosts where everything is. An error, and a host without an answer, make it a
/// failure.
ctl::Page showFleetChecks(const std::vector<HostAnswer>& answers, ctl::Format format);

}  // namespace fleet
