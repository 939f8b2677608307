/// The names by which hosts and operators reach the centre and the bus.
#pragma once

#include <string>
#include <vector>

namespace fleet {

bool isIpAddress(const std::string& text);

/// Throws KeysError unless all are DNS names or IP addresses and the first is a DNS name: that is
/// what those who connect to the bus insist on, whichever of its servers they reach.
void checkServerNames(const std::vector<std::string>& names);

}  // namespace fleet
