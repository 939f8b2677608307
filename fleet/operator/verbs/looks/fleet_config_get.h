/// config get: an agent's configuration on many hosts, which of them have the same, and where the
/// others differ.
#pragma once

#include <string>
#include <vector>

#include "ctl/show/page.h"
#include "fleet/operator/questions/asked_hosts.h"

namespace fleet {

/// The largest group of hosts with equal configurations first; with `isDiff` the others as what
/// differs from that. Hosts without a configuration, or with one that is not whole, make it a
/// failure.
ctl::Page showConfigurations(const std::vector<HostAnswer>& answers, bool isDiff,
                             ctl::Format format);

/// The lines that differ between two texts: "-" before those of the first one only, "+" before
/// those of the second. For texts that are too long to be compared, all lines of both.
std::string differingLines(const std::string& before, const std::string& after);

}  // namespace fleet
