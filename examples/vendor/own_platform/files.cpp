// Directory listings, over the C++ standard library.

#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <memory>
#include <string>
#include <system_error>

#include "platform/fsi1.h"

namespace fs = std::filesystem;

struct FSI1_LIST {
    fs::directory_iterator next;
};

namespace {

/// What a link leads to, or the link itself when it leads nowhere.
bool examine(const std::string& path, struct stat& found) {
    return ::stat(path.c_str(), &found) == 0 || ::lstat(path.c_str(), &found) == 0;
}

}  // namespace

int FSI1_NewList(const char* directory, FSI1_LIST** list) {
    *list = nullptr;
    if (directory == nullptr) return EINVAL;
    std::error_code error;
    fs::directory_iterator first(directory, error);
    if (error) return error.value();
    *list = std::make_unique<FSI1_LIST>(FSI1_LIST{std::move(first)}).release();
    return FSI1_OK;
}

int FSI1_FetchList(FSI1_LIST* list, FSI1_ENTRY* entry) {
    if (list == nullptr) return EINVAL;
    while (list->next != fs::directory_iterator()) {
        const std::string path = list->next->path().string();
        std::error_code error;
        list->next.increment(error);
        if (error) return error.value();
        struct stat found {};
        if (path.size() >= sizeof entry->path || !examine(path, found)) continue;
        std::memcpy(entry->path, path.c_str(), path.size() + 1);
        entry->timeStamp = found.st_mtime;
        entry->isDirectory = S_ISDIR(found.st_mode);
        return FSI1_OK;
    }
    return FSI1_END_OF_LIST;
}

int FSI1_DeleteList(FSI1_LIST* list) {
    const std::unique_ptr<FSI1_LIST> gone(list);
    return gone ? FSI1_OK : EINVAL;
}
