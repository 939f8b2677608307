#include "fleet/link/program/directory_lock.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cerrno>
#include <system_error>

#include "fleet/files/file_error.h"

namespace fleet {

sys::FileDescriptor lockDirectory(const std::string& directory) {
    const std::string path = directory + "/lock";
    sys::FileDescriptor lock(::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!lock) throw FileError(path + ": " + std::generic_category().message(errno));
    if (::flock(lock.get(), LOCK_EX | LOCK_NB) != 0) {
        throw FileError(directory + " is in use by another zavlink");
    }
    return lock;
}

}  // namespace fleet
