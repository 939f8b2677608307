#include "host/depot/depot_directory.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <system_error>

#include "host/process/log.h"
#include "host/process/start_error.h"

namespace host {
namespace {

/// 0, or why there is no such directory.
int directoryFault(const std::string& path) {
    struct stat found {};
    if (::stat(path.c_str(), &found) != 0) return errno;
    return S_ISDIR(found.st_mode) ? 0 : ENOTDIR;
}

void makeDirectory(const std::string& path) {
    if (::mkdir(path.c_str(), 0700) == 0) return;
    const int reason = errno;
    if (reason == EEXIST && directoryFault(path) == 0) return;
    throw StartError("cannot make the depot directory " + path + ": " +
                     std::strerror(reason == EEXIST ? ENOTDIR : reason));
}

}  // namespace

DepotDirectory depotDirectoryOf(const std::string& home, const char* named, bool guarded) {
    if (!guarded) return {named != nullptr ? named : home, false};
    // An empty name is no name: the plug-in would refuse every transfer.
    if (named != nullptr && *named != '\0') return {named, false};
    return {home + "/depot", true};
}

bool holdsHome(const DepotDirectory& depot, const std::string& home) {
    std::error_code error;
    std::filesystem::path at = std::filesystem::canonical(home, error);
    while (!error) {
        if (std::filesystem::equivalent(at, depot.path, error)) return true;
        if (!at.has_relative_path()) return false;
        at = at.parent_path();
    }
    return false;
}

void provideDepotDirectory(const DepotDirectory& depot) {
    if (!depot.isOwnChoice) return;
    makeDirectory(depot.path);
    ::setenv(kDepotVariable, depot.path.c_str(), 1);
    // Composed from its end: the compiler sees an overflow where a short text is added to.
    std::string text = depot.path;
    text.insert(0, " is not set; the depot is ").insert(0, kDepotVariable);
    say(Priority::Notice, text);
}

void requireDepotDirectory(const DepotDirectory& depot) {
    const int fault = directoryFault(depot.path);
    if (fault == 0) return;
    throw StartError("the depot " + depot.path + " is not there and could not be made (" +
                     std::strerror(fault) +
                     "); every command and every push would be refused; name a directory that the "
                     "host's user may write to in " +
                     kDepotVariable);
}

}  // namespace host
