/// Lists of names in what a check says.
#pragma once

#include <string>
#include <vector>

namespace host {

/// The first five names, sorted and separated by commas, and how many more there are. Control
/// characters become "?".
std::string listed(std::vector<std::string> names);

}  // namespace host
