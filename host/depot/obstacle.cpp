#include "host/depot/obstacle.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

#include "host/depot/beneath.h"

namespace host {
namespace {

std::string quoted(const std::string& path) {
    return path.empty() ? "the depot" : path;
}

/// The path without its last component and the slashes before that.
std::string above(std::string path) {
    const std::size_t slash = path.rfind('/');
    path.resize(slash == std::string::npos ? 0 : slash);
    path.resize(path.find_last_not_of('/') + 1);
    return path;
}

bool hasLongPart(int root, const std::string& path) {
    const long most = ::fpathconf(root, _PC_NAME_MAX);
    if (most <= 0) return false;
    for (std::size_t at = 0; at < path.size();) {
        const std::size_t end = std::min(path.find('/', at), path.size());
        if (end - at > static_cast<std::size_t>(most)) return true;
        at = end + 1;
    }
    return false;
}

std::string obstacleInDirectory(int directory, const std::string& name) {
    if (::faccessat(directory, ".", W_OK | X_OK, AT_EACCESS) != 0) {
        return "the host's user may not write to " + quoted(name);
    }
    return {};
}

/// What stands in the place of a directory that cannot be opened; empty when nothing does.
std::string obstacleInPlaceOf(int root, const std::string& directory) {
    if (errno == ENOTDIR) return quoted(directory) + " is no directory";
    if (errno == ELOOP) return quoted(directory) + " is a link that leads nowhere";
    // A link whose end is missing looks like nothing, until a directory is to be made there.
    if (openBeneath(root, directory, O_PATH | O_NOFOLLOW)) {
        return quoted(directory) + " is a link that leads nowhere";
    }
    return {};
}

}  // namespace

std::string obstacleAt(const std::string& depot, const std::string& path) {
    const std::string name = path.substr(path.rfind('/') + 1);  // npos + 1 is 0
    if (name.empty() || name == "." || name == "..") return "the name is that of a directory";
    const FileDescriptor root(::open(depot.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (!root) return {};
    if (hasLongPart(root.get(), path)) return "a part of the name is too long";
    std::string directory = above(path);
    for (bool isParent = true;; isParent = false) {
        const FileDescriptor found = openBeneath(root.get(), directory, O_PATH | O_DIRECTORY);
        if (found) {
            struct stat there {};
            const bool isTaken =
                isParent &&
                ::fstatat(found.get(), name.c_str(), &there, AT_SYMLINK_NOFOLLOW) == 0 &&
                S_ISDIR(there.st_mode);
            if (isTaken) return "a directory of that name is there";
            return obstacleInDirectory(found.get(), directory);
        }
        if (std::string obstacle = obstacleInPlaceOf(root.get(), directory); !obstacle.empty()) {
            return obstacle;
        }
        if (directory.empty()) return {};
        directory = above(directory);
    }
}

}  // namespace host
