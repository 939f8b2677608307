/// Looks for a file of the depot.
#pragma once

#include <string>

namespace host {

enum class DepotFile {
    There,    ///< a regular file
    Missing,  ///< nothing has that name, or what has it is no regular file
    Outside,  ///< the name leads out of the depot, or through an absolute link
};

/// Follows the links in the name, but none that leads out of the depot. Nothing is opened that a
/// look could change or that could block.
DepotFile findInDepot(const std::string& depot, const std::string& name);

}  // namespace host
