/// Which directory receives transferred files.
#pragma once

#include <string>

namespace host {

/// The variable that names the depot. The plug-in reads it too.
inline constexpr const char* kDepotVariable = "QVSDEPLOY_AGENTDEPOT";

struct DepotDirectory {
    std::string path;
    /// Nobody named it: the host's own choice, in place of the home directory itself, where a
    /// transfer could overwrite the home's programs.
    bool isOwnChoice = false;
};

/// The depot of a host on `home`. `named` is the value of kDepotVariable, null when it is not set.
/// An unguarded host leaves the choice to the plug-in, which takes the home directory itself.
DepotDirectory depotDirectoryOf(const std::string& home, const char* named, bool guarded);

/// Makes the host's own choice: creates the directory with mode 0700 unless it is there, sets
/// kDepotVariable for the plug-in and says so on standard error. Does nothing about a depot that
/// somebody named. Call it before the plug-in starts, while there is one thread. Throws StartError
/// when the directory cannot be made.
void provideDepotDirectory(const DepotDirectory& depot);

/// Throws StartError when the depot is no directory. The plug-in makes the one that somebody named
/// when it starts; if it cannot, it says nothing and refuses every command from then on.
void requireDepotDirectory(const DepotDirectory& depot);

/// Whether the depot is the home or a directory around it, so that transfers could replace the
/// home's programs. Links are followed.
bool holdsHome(const DepotDirectory& depot, const std::string& home);

}  // namespace host
