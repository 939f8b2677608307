#include "host/depot/remove_tree.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <utility>
#include <vector>

#include "host/process/system/directory_stream.h"
#include "system/file_descriptor.h"

namespace host {
namespace {

/// Each takes a descriptor while the work goes on.
constexpr std::size_t kDeepest = 200;

DirectoryStream openDirectory(int parent, const char* name) {
    sys::FileDescriptor opened(
        ::openat(parent, name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC | O_NONBLOCK));
    DirectoryStream directory(opened ? ::fdopendir(opened.get()) : nullptr);
    if (directory) opened.release();
    return directory;
}

/// Directories that are being emptied, the innermost last.
class Removal {
public:
    explicit Removal(int parent) : parent_(parent) {}

    int run(const std::string& name) {
        if (!enter(name)) return errno;
        while (!open_.empty()) {
            if (const int reason = step()) return reason;
        }
        return 0;
    }

private:
    struct Level {
        std::string name;
        DirectoryStream directory;
    };

    int above() const {
        return open_.size() < 2 ? parent_ : ::dirfd(open_[open_.size() - 2].directory.get());
    }

    bool enter(const std::string& name) {
        if (open_.size() == kDeepest) {
            errno = ENAMETOOLONG;
            return false;
        }
        DirectoryStream directory = openDirectory(
            open_.empty() ? parent_ : ::dirfd(open_.back().directory.get()), name.c_str());
        if (!directory) return false;
        open_.push_back({name, std::move(directory)});
        return true;
    }

    /// Removes the next entry of the innermost directory, or the directory when it is empty.
    int step() {
        DIR* const here = open_.back().directory.get();
        errno = 0;
        const dirent* const entry = ::readdir(here);
        if (entry == nullptr) return errno != 0 ? errno : leave();
        const std::string name = entry->d_name;
        if (name == "." || name == "..") return 0;
        if (::unlinkat(::dirfd(here), name.c_str(), 0) == 0 || errno == ENOENT) return 0;
        if (errno != EISDIR && errno != EPERM) return errno;
        return enter(name) ? 0 : errno;
    }

    int leave() {
        const int failed = ::unlinkat(above(), open_.back().name.c_str(), AT_REMOVEDIR);
        const int reason = failed != 0 ? errno : 0;
        open_.pop_back();
        return reason;
    }

    const int parent_;
    std::vector<Level> open_;
};

}  // namespace

int removeTree(int parent, const std::string& name) {
    return Removal(parent).run(name);
}

}  // namespace host
