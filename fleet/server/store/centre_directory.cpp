#include "fleet/server/store/centre_directory.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <system_error>

#include "fleet/server/store/store_error.h"

namespace fleet {
namespace {

StoreError errorOf(const std::string& what) {
    return StoreError(what + ": " + std::generic_category().message(errno));
}

void makePrivateDirectory(const std::string& path) {
    if (::mkdir(path.c_str(), 0700) != 0 && errno != EEXIST) throw errorOf("cannot make " + path);
    struct stat found {};
    if (::stat(path.c_str(), &found) != 0) throw errorOf(path);
    if (!S_ISDIR(found.st_mode)) throw StoreError(path + " is no directory");
    if (found.st_uid != ::geteuid() || (found.st_mode & 077U) != 0) {
        throw StoreError(path + " may be used by others; make it the centre's own, with mode 0700");
    }
}

/// The lock ends with the process, however that ends.
int takeLock(const std::string& path) {
    const std::string file = path + "/lock";
    const int lock = ::open(file.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600);
    if (lock < 0) throw errorOf(file);
    if (::flock(lock, LOCK_EX | LOCK_NB) == 0) return lock;
    const bool isTaken = errno == EWOULDBLOCK;
    const StoreError error =
        isTaken ? StoreError("another process uses " + path) : errorOf("cannot lock " + file);
    ::close(lock);
    throw error;
}

}  // namespace

CentreDirectory::CentreDirectory(const std::string& path) : path_(path) {
    makePrivateDirectory(path_);
    lock_ = takeLock(path_);
}

CentreDirectory::~CentreDirectory() {
    ::close(lock_);
}

void syncFolderOf(const std::string& file) {
    const std::string parent = std::filesystem::absolute(file).parent_path().string();
    const int folder = ::open(parent.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (folder < 0) throw errorOf(parent);
    const bool isSynced = ::fsync(folder) == 0;
    const StoreError error = errorOf("cannot sync " + parent);
    ::close(folder);
    if (!isSynced) throw error;
}

}  // namespace fleet
