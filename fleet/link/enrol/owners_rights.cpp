#include "fleet/link/enrol/owners_rights.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <system_error>

#include "fleet/files/file_error.h"

namespace fleet {

OwnersRights::OwnersRights(const std::string& directory) : group_(::getegid()) {
    struct stat found {};
    if (::stat(directory.c_str(), &found) != 0) {
        throw FileError(directory + ": " + std::generic_category().message(errno));
    }
    if (!S_ISDIR(found.st_mode)) throw FileError(directory + ": is no directory");
    if (::geteuid() != 0 || found.st_uid == 0) return;
    if (::setegid(found.st_gid) != 0 || ::seteuid(found.st_uid) != 0) {
        const int error = errno;
        if (::setegid(group_) != 0) std::abort();
        throw FileError(directory + ": its owner's rights cannot be taken on: " +
                        std::generic_category().message(error));
    }
    isChanged_ = true;
}

OwnersRights::~OwnersRights() {
    if (!isChanged_) return;
    // What follows would be done with the wrong rights.
    if (::seteuid(0) != 0 || ::setegid(group_) != 0) std::abort();
}

}  // namespace fleet
