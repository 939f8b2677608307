#include "host/depot/transfers/arrival_directory.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <utility>

#include "host/depot/beneath.h"
#include "host/depot/real_path.h"

namespace host {
namespace {

std::string named(const std::string& path) {
    return path.empty() ? "the depot" : path;
}

/// The path without its last component and the slashes before that.
std::string above(std::string path) {
    const std::size_t slash = path.rfind('/');
    path.resize(slash == std::string::npos ? 0 : slash);
    path.resize(path.find_last_not_of('/') + 1);
    return path;
}

bool hasLongPart(const std::string& path, long most) {
    if (most <= 0) return false;
    for (std::size_t at = 0; at < path.size();) {
        const std::size_t end = std::min(path.find('/', at), path.size());
        if (end - at > static_cast<std::size_t>(most)) return true;
        at = end + 1;
    }
    return false;
}

/// What stands in the place of a directory that could not be opened, for which errno still says
/// why; empty when nothing does.
std::string obstacleInPlaceOf(int depot, const std::string& directory) {
    if (errno == ENOTDIR) return named(directory) + " is no directory";
    if (errno == ELOOP) return named(directory) + " is a link that leads nowhere";
    // A link whose end is missing looks like nothing, until a directory is to be made there.
    if (openBeneath(depot, directory, O_PATH | O_NOFOLLOW)) {
        return named(directory) + " is a link that leads nowhere";
    }
    return {};
}

constexpr const char* kPartIsTooLong = "a part of the name is too long";

}  // namespace

ArrivalDirectory::ArrivalDirectory(const std::string& depot, std::string name)
    : name_(std::move(name)), real_(host::realPath(depot + "/" + name_)) {
    const sys::FileDescriptor top(::open(depot.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (!top) return;
    longestPart_ = ::fpathconf(top.get(), _PC_NAME_MAX);
    if (hasLongPart(name_, longestPart_)) obstacle_ = kPartIsTooLong;
    lookFrom(top.get());
}

/// Finds the nearest directory that is there, in which those that are missing would be made.
void ArrivalDirectory::lookFrom(int depot) {
    std::string directory = above(name_);
    for (bool isItself = true; obstacle_.empty(); isItself = false) {
        sys::FileDescriptor found = openBeneath(depot, directory, O_PATH | O_DIRECTORY);
        if (found) {
            if (::faccessat(found.get(), ".", W_OK | X_OK, AT_EACCESS) != 0) {
                obstacle_ = "the host's user may not write to " + named(directory);
            }
            if (isItself) opened_ = std::move(found);
            return;
        }
        leadsOut_ = errno == EXDEV;
        if (leadsOut_) return;
        obstacle_ = obstacleInPlaceOf(depot, directory);
        if (directory.empty()) return;
        directory = above(directory);
    }
}

std::string ArrivalDirectory::obstacleTo(const std::string& file) const {
    if (file.empty() || file == "." || file == "..") return "the name is that of a directory";
    if (!obstacle_.empty()) return obstacle_;
    if (hasLongPart(file, longestPart_)) return kPartIsTooLong;
    const auto there = find(file);
    return there && S_ISDIR(there->st_mode) ? "a directory of that name is there" : "";
}

std::optional<struct stat> ArrivalDirectory::find(const std::string& file) const {
    struct stat there {};
    if (!opened_) return std::nullopt;
    if (::fstatat(opened_.get(), file.c_str(), &there, AT_SYMLINK_NOFOLLOW) != 0) {
        return std::nullopt;
    }
    return there;
}

}  // namespace host
