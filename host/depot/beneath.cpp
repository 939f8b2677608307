#include "host/depot/beneath.h"

#include <fcntl.h>
#include <limits.h>
#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>

#include <algorithm>
#include <cerrno>
#include <vector>

namespace host {
namespace {

/// As many links as the kernel follows in one path.
constexpr int kMostLinks = 40;
/// Each takes a descriptor while the walk goes on.
constexpr std::size_t kMostDirectories = 256;

/// Splits off the first component; an empty one stands for the end of the path.
std::string takeComponent(std::string& path) {
    const std::size_t begin = path.find_first_not_of('/');
    if (begin == std::string::npos) {
        path.clear();
        return "";
    }
    const std::size_t end = std::min(path.find('/', begin), path.size());
    const std::string component = path.substr(begin, end - begin);
    path.erase(0, end);
    return component;
}

/// The directories from the root to where a walk has come. ".." goes back to the one that was left,
/// wherever it may have been moved meanwhile.
class Walk {
public:
    Walk(int root, std::string path, int flags)
        : root_(root), rest_(std::move(path)), flags_(flags) {}

    sys::FileDescriptor run() {
        if (!rest_.empty() && rest_.front() == '/') return fail(EXDEV);
        for (;;) {
            const std::string component = takeComponent(rest_);
            if (component.empty()) return openHere();
            if (component == ".") continue;
            if (component == "..") {
                if (below_.empty()) return fail(EXDEV);
                below_.pop_back();
                continue;
            }
            // Behind a slash at the end there must be a directory, and links to it are followed.
            const bool isEnd = rest_.empty();
            if (isEnd && (flags_ & O_NOFOLLOW) != 0) return open(component, flags_);
            if (!enter(component, isEnd)) return {};
            if (last_) return std::move(last_);
        }
    }

private:
    int here() const { return below_.empty() ? root_ : below_.back().get(); }

    sys::FileDescriptor fail(int reason) const {
        errno = reason;
        return {};
    }

    sys::FileDescriptor open(const std::string& component, int flags) const {
        return sys::FileDescriptor(
            ::openat(here(), component.c_str(), flags | O_NOFOLLOW | O_CLOEXEC));
    }

    sys::FileDescriptor openHere() const {
        return sys::FileDescriptor(::openat(here(), ".", flags_ | O_CLOEXEC));
    }

    /// Goes to a component, or takes a link's text in its place. Sets last_ when it is the end.
    bool enter(const std::string& component, bool isEnd) {
        sys::FileDescriptor found = open(component, O_PATH);
        struct stat status {};
        if (!found || ::fstat(found.get(), &status) != 0) return false;
        if (S_ISLNK(status.st_mode)) return replaceByTarget(found);
        if (S_ISDIR(status.st_mode)) {
            if (below_.size() == kMostDirectories) {
                errno = ENAMETOOLONG;
                return false;
            }
            below_.push_back(std::move(found));
            return true;
        }
        if (!isEnd) {
            errno = ENOTDIR;
            return false;
        }
        last_ = open(component, flags_);
        return static_cast<bool>(last_);
    }

    bool replaceByTarget(const sys::FileDescriptor& link) {
        char target[PATH_MAX];
        const ssize_t length = ::readlinkat(link.get(), "", target, sizeof target);
        if (length <= 0) return false;
        if (target[0] == '/') {
            errno = EXDEV;
            return false;
        }
        if (++links_ > kMostLinks) {
            errno = ELOOP;
            return false;
        }
        rest_.insert(0, std::string(target, static_cast<std::size_t>(length)));
        return true;
    }

    const int root_;
    std::string rest_;
    const int flags_;
    std::vector<sys::FileDescriptor> below_;
    sys::FileDescriptor last_;
    int links_ = 0;
};

sys::FileDescriptor askKernel(int root, const std::string& path, int flags) {
    open_how how{};
    how.flags = static_cast<unsigned>(flags) | O_CLOEXEC;
    how.resolve = RESOLVE_BENEATH | RESOLVE_NO_MAGICLINKS;
    // EAGAIN: something was renamed meanwhile, so that the kernel could not be sure about a "..".
    for (int attempts = 0;; ++attempts) {
        const long opened = ::syscall(SYS_openat2, root, path.c_str(), &how, sizeof how);
        if (opened >= 0) return sys::FileDescriptor(static_cast<int>(opened));
        if (errno != EAGAIN || attempts == 100) return {};
    }
}

}  // namespace

sys::FileDescriptor walkBeneath(int root, const std::string& path, int flags) {
    return Walk(root, path, flags).run();
}

sys::FileDescriptor openBeneath(int root, const std::string& path, int flags) {
    sys::FileDescriptor opened = askKernel(root, path.empty() ? "." : path, flags);
    // EPERM: some sandboxes do not know the call and forbid it.
    if (opened || (errno != ENOSYS && errno != EPERM)) return opened;
    return walkBeneath(root, path, flags);
}

}  // namespace host
