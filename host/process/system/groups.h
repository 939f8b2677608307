/// Groups of users whom the host serves beside its own user and root.
#pragma once

#include <sys/types.h>

#include <optional>
#include <string>

namespace host {

/// A group by name and number.
struct Group {
    std::string name;
    gid_t number = 0;
};

struct AccessGroups {
    std::optional<Group> act;   ///< its members may do everything
    std::optional<Group> read;  ///< its members may look, but change nothing

    bool any() const { return act || read; }
};

/// The group of this name. `option` is what names it, for the error. Throws StartError if there is
/// none.
Group groupNamed(const std::string& option, const std::string& name);

}  // namespace host
