#include "ras1/log_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

namespace ras1 {
namespace {

// The null device's numbers, which are the same on every Linux.
constexpr unsigned kMemoryMajor = 1;
constexpr unsigned kNullMinor = 3;

/// A regular file, or the null device, which many choose for no log at all.
bool canBeLog(int descriptor) {
    struct stat found {};
    if (::fstat(descriptor, &found) != 0) return false;
    return S_ISREG(found.st_mode) ||
           (S_ISCHR(found.st_mode) && found.st_rdev == ::makedev(kMemoryMajor, kNullMinor));
}

/// Renames a regular file. What else has its name stays where it is: the null device, or a
/// directory that somebody put there.
bool move(const std::string& from, const std::string& to) {
    struct stat found {};
    if (::lstat(from.c_str(), &found) != 0) return false;
    errno = EINVAL;
    return S_ISREG(found.st_mode) && std::rename(from.c_str(), to.c_str()) == 0;
}

}  // namespace

int ownDescriptor(int descriptor) {
    return ::fcntl(descriptor, F_DUPFD_CLOEXEC, 3);
}

int openLog(const std::string& path) {
    if (path.empty()) return -1;
    constexpr int kFlags =
        O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY;
    // A password may get into it that nothing recognises as one.
    constexpr mode_t kOwnersAlone = 0600;
    const int opened = ::open(path.c_str(), kFlags, kOwnersAlone);
    if (opened != -1 && !canBeLog(opened)) {
        ::close(opened);
        return -1;
    }
    if (opened == -1 || opened > STDERR_FILENO) return opened;
    const int moved = ownDescriptor(opened);
    ::close(opened);
    return moved;
}

std::uint64_t sizeOf(int descriptor) {
    struct stat found {};
    const bool isFile = ::fstat(descriptor, &found) == 0 && S_ISREG(found.st_mode);
    return isFile ? static_cast<std::uint64_t>(found.st_size) : 0;
}

bool shiftLogs(const std::string& path, int kept) {
    for (int i = kept; i > 1; --i) {
        const bool moved = move(path + "." + std::to_string(i - 1), path + "." + std::to_string(i));
        if (!moved && errno != ENOENT) return false;
    }
    return move(path, path + ".1");
}

}  // namespace ras1
