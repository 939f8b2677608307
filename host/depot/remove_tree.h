/// Removing a directory with everything in it.
#pragma once

#include <string>

namespace host {

/// Removes the directory `name` of the open directory `parent`. Links are removed, never followed.
/// Returns 0, or the first errno; what could be removed before it is gone then. Directories may lie
/// 200 deep, else it is ENAMETOOLONG.
int removeTree(int parent, const std::string& name);

}  // namespace host
