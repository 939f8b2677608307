#include "rpc/beneath.h"

#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace ZAV {
namespace {

// The kernel's own resolution is asked for by number, because older C libraries do not know it.
constexpr long kOpenat2 = 437;  // the same number on every architecture
constexpr std::uint64_t kNoMagicLinks = 0x02;
constexpr std::uint64_t kBeneath = 0x08;

/// The kernel's struct open_how.
struct OpenHow {
    std::uint64_t flags;
    std::uint64_t mode;
    std::uint64_t resolve;
};

constexpr int kMostTries = 64;
constexpr int kMostLinks = 40;  // as in the kernel

/// Descriptors of O_PATH take none of the other flags, and wait for nothing.
int allFlags(int flags) {
    return (flags & O_PATH) != 0 ? flags | O_CLOEXEC : flags | kOpenFlags | O_LARGEFILE;
}

FileDescriptor take(int fd, int flags) {
    return (flags & O_PATH) != 0 ? takeDescriptor(fd) : takeOpened(fd);
}

/// EAGAIN: a rename somewhere came between, so that the kernel is not sure about a "..".
int openByKernel(int top, const char* name, int flags, mode_t mode) {
    OpenHow how{};
    how.flags = static_cast<std::uint64_t>(allFlags(flags));
    how.mode = (flags & O_CREAT) != 0 ? mode : 0;
    how.resolve = kBeneath | kNoMagicLinks;
    int tries = 0;
    long fd;
    do {
        fd = ::syscall(kOpenat2, top, name, &how, sizeof how);
    } while (fd < 0 && (errno == EINTR || (errno == EAGAIN && ++tries < kMostTries)));
    return static_cast<int>(fd);
}

/// Resolves a name step by step, for kernels that do not. The directory reached is held open, and
/// each step begins there. ".." is never asked of the system, whose answer could lie outside after
/// a rename: the way to the directory above is walked again from the top. No link is followed by
/// the system either: its target is read, and takes its place in the name.
class Walk {
public:
    Walk(int top, const char* name) : top_(top), rest_(name) {}

    FileDescriptor open(int flags, mode_t mode) {
        if (rest_.empty()) return fail(ENOENT);
        if (rest_[0] == '/') return fail(EXDEV);
        while (!rest_.empty()) {
            const std::string step = takeStep();
            if (step.empty() || step == ".") continue;
            const bool last = rest_.empty();
            const Step taken = step == ".." ? goBack() : goOn(step, last);
            if (taken == Step::kFailed) return FileDescriptor();
            if (taken == Step::kIsLast) return openAt(step.c_str(), flags | O_NOFOLLOW, mode);
        }
        return openAt(".", flags, mode);
    }

private:
    enum class Step { kTaken, kIsLast, kFailed };

    static FileDescriptor fail(int error) {
        errno = error;
        return FileDescriptor();
    }

    FileDescriptor openAt(const char* name, int flags, mode_t mode) const {
        const int directory = reached_.isOpen() ? reached_.get() : top_;
        int fd;
        do {
            fd = ::openat(directory, name, allFlags(flags), mode);
        } while (fd < 0 && errno == EINTR);
        return take(fd, flags);
    }

    /// Cuts the next component off, with the slash behind it. What remains of "a/" is ".", so that
    /// "a" is not mistaken for the last component.
    std::string takeStep() {
        const std::size_t end = rest_.find('/');
        if (end == std::string::npos) return std::exchange(rest_, {});
        const std::string step = rest_.substr(0, end);
        rest_.erase(0, end + 1);
        if (rest_.empty()) rest_.assign(1, '.');
        return step;
    }

    Step goOn(const std::string& step, bool last) {
        char target[PATH_MAX];
        const int directory = reached_.isOpen() ? reached_.get() : top_;
        const ssize_t length = ::readlinkat(directory, step.c_str(), target, sizeof target);
        if (length > 0) return follow(std::string(target, static_cast<std::size_t>(length)));
        if (last) return Step::kIsLast;
        if (enter(step)) way_.push_back(step);
        return reached_.isOpen() ? Step::kTaken : Step::kFailed;
    }

    /// Puts a link's target in front of the rest.
    Step follow(const std::string& target) {
        const bool tooMany = ++links_ > kMostLinks;
        if (tooMany || target[0] == '/') {
            errno = tooMany ? ELOOP : EXDEV;
            return Step::kFailed;
        }
        std::string name = target;
        if (!rest_.empty()) name += '/';
        name += rest_;
        rest_ = std::move(name);
        return Step::kTaken;
    }

    bool enter(const std::string& step) {
        reached_ = openAt(step.c_str(), O_PATH | O_DIRECTORY | O_NOFOLLOW, 0);
        return reached_.isOpen();
    }

    Step goBack() {
        if (way_.empty()) {
            errno = EXDEV;
            return Step::kFailed;
        }
        way_.pop_back();
        reached_.close();
        for (const std::string& step : way_) {
            if (!enter(step)) return Step::kFailed;
        }
        return Step::kTaken;
    }

    const int top_;
    FileDescriptor reached_;        ///< not open at the top itself
    std::vector<std::string> way_;  ///< from the top to the directory reached
    std::string rest_;
    int links_ = 0;
};

bool kernelCannot(int error) {
    return error == ENOSYS || error == EPERM || error == EAGAIN;
}

}  // namespace

FileDescriptor openBeneath(int top, const char* name, int flags, mode_t mode) {
    const int fd = openByKernel(top, name, flags, mode);
    if (fd >= 0 || !kernelCannot(errno)) return take(fd, flags);
    return Walk(top, name).open(flags, mode);
}

}  // namespace ZAV
