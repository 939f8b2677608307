/// The list of users whom agents run as, config/<host>_zavrunas.cfg in the home.
#pragma once

#include <set>
#include <string>
#include <vector>

namespace host {

struct RunAsList {
    std::string path;
    bool isThere = false;  ///< whatever is there, also what cannot be read
    /// Why the plug-in would overlook the list or an entry of it and start agents as the host's
    /// user, in words; "" if it would not.
    std::string fault;
    /// The users named in it, in the code page of the process's locale, as far as it could be read.
    std::set<std::string> users;
};

/// Reads the list as the plug-in does, up to 16 MiB. Never waits for a pipe. Any thread.
RunAsList readRunAsList(const std::string& home);

/// The lists of other hosts' names in the same folder that name a user, or may: sorted paths.
/// Nobody reads them here. Any thread.
std::vector<std::string> foreignRunAsLists(const std::string& home);

}  // namespace host
