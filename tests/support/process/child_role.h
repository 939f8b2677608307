/// Lets a test program be its own child: started with a role it reports on itself and ends before
/// any test runs.
#pragma once

#include <set>
#include <string>

namespace child_role {

/// The path of this program.
std::string program();

/// The entry for a child's environment that makes this program take `role`:
///   "descriptors"  prints the numbers of the descriptors that it was started with, one a line
///   "signals"      prints "blocked N" and "ignored N" for each such signal
std::string environmentEntry(const std::string& role);

/// The open descriptors of this process; those that a child inherits only, when asked.
std::set<int> openDescriptors(bool inheritedOnly = false);

}  // namespace child_role
