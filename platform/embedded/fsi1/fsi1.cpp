#include "platform/fsi1.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <new>
#include <string>

struct FSI1_LIST {
    DIR* directory;
    std::string prefix;  ///< of every path: the directory and a slash
};

namespace {

/// An errno value as a result code. The numbers that mean something else here become EIO.
int resultOf(int error) {
    return error == FSI1_OK || error == FSI1_END_OF_LIST ? EIO : error;
}

bool isDotOrDotDot(const char* name) {
    return name[0] == '.' && (name[1] == '\0' || (name[1] == '.' && name[2] == '\0'));
}

/// Examines an entry; of a dangling link, the link itself. Returns 0 or an errno value.
int examine(int directory, const char* name, struct stat& found) {
    if (::fstatat(directory, name, &found, 0) == 0) return 0;
    return ::fstatat(directory, name, &found, AT_SYMLINK_NOFOLLOW) == 0 ? 0 : errno;
}

bool joinPath(const std::string& prefix, const char* name, char (&path)[4096]) {
    const std::size_t length = std::strlen(name);
    if (prefix.size() + length >= sizeof path) return false;
    std::memcpy(path, prefix.data(), prefix.size());
    std::memcpy(path + prefix.size(), name, length + 1);
    return true;
}

}  // namespace

int FSI1_NewList(const char* directory, FSI1_LIST** list) {
    *list = nullptr;
    if (directory == nullptr) return EINVAL;
    DIR* const opened = ::opendir(directory);
    if (opened == nullptr) return resultOf(errno);
    try {
        std::string prefix = directory;
        if (prefix.back() != '/') prefix += '/';
        *list = new FSI1_LIST{opened, std::move(prefix)};
    } catch (const std::bad_alloc&) {
        ::closedir(opened);
        return ENOMEM;
    }
    return FSI1_OK;
}

int FSI1_FetchList(FSI1_LIST* list, FSI1_ENTRY* entry) {
    if (list == nullptr || entry == nullptr) return EINVAL;
    for (;;) {
        errno = 0;
        const dirent* const next = ::readdir(list->directory);
        if (next == nullptr) return errno == 0 ? FSI1_END_OF_LIST : resultOf(errno);
        if (isDotOrDotDot(next->d_name)) continue;
        struct stat found {};
        const int error = examine(::dirfd(list->directory), next->d_name, found);
        if (error == ENOENT) continue;
        if (error != 0) return resultOf(error);
        if (!joinPath(list->prefix, next->d_name, entry->path)) continue;
        entry->timeStamp = found.st_mtime;
        entry->isDirectory = S_ISDIR(found.st_mode);
        return FSI1_OK;
    }
}

int FSI1_DeleteList(FSI1_LIST* list) {
    const std::unique_ptr<FSI1_LIST> owned(list);
    if (!owned) return EINVAL;
    return ::closedir(owned->directory) == 0 ? FSI1_OK : resultOf(errno);
}
