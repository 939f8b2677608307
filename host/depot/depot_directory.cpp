#include "host/depot/depot_directory.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <system_error>

#include "host/process/start_error.h"

namespace host {
namespace {

bool isDirectory(const std::string& path) {
    struct stat found {};
    return ::stat(path.c_str(), &found) == 0 && S_ISDIR(found.st_mode);
}

void makeDirectory(const std::string& path) {
    if (::mkdir(path.c_str(), 0700) == 0) return;
    const int reason = errno;
    if (reason == EEXIST && isDirectory(path)) return;
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
    std::fprintf(stderr, "zavhost: %s is not set; the depot is %s\n", kDepotVariable,
                 depot.path.c_str());
}

}  // namespace host
