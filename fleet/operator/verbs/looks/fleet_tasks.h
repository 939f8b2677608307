/// tasks: what many hosts were asked for, from the hosts themselves.
#pragma once

#include <vector>

#include "ctl/show/page.h"
#include "ctl/show/time_text.h"
#include "fleet/operator/questions/asked_hosts.h"

namespace fleet {

/// A host after the other. Hosts without an answer make it a failure.
ctl::Page showFleetTasks(const std::vector<HostAnswer>& answers, ctl::WallTime now,
                         ctl::Format format);

/// What is said of hosts that have not answered: a line for each.
std::string troubleLines(const std::vector<HostAnswer>& answers);

}  // namespace fleet
