/// hosts label: changes the labels that the centre knows a host by.
#pragma once

#include <map>
#include <string>
#include <vector>

namespace fleet {

/// The labels after some changes: NAME=VALUE gives one a value, and NAME- takes it away. Throws
/// ctl::Failure(kWrongUsage) for other words, and for a label that is not there to be taken away.
std::map<std::string, std::string> changedLabels(std::map<std::string, std::string> labels,
                                                 const std::vector<std::string>& changes);

}  // namespace fleet
