#include "util/process/child_end.h"

#include <poll.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <ctime>
#include <mutex>
#include <new>
#include <vector>

namespace ZAV {
namespace {

constexpr int kLongestStep = 20;

#ifdef SYS_pidfd_open
constexpr long kPidfdOpen = SYS_pidfd_open;
#else
constexpr long kPidfdOpen = 434;  // the same number on every architecture
#endif

struct Forgotten {
    std::mutex mutex;
    std::vector<pid_t> children;  // guarded by the mutex
};

Forgotten& forgotten() {
    // Never destroyed, because threads that outlive main use it. Constructed in static storage,
    // because the callers cannot handle a failed allocation.
    alignas(Forgotten) static unsigned char place[sizeof(Forgotten)];
    static Forgotten& instance = *new (place) Forgotten;
    return instance;
}

/// May return early.
void sleepFor(int milliseconds) {
    constexpr long kNanosecondsPerMillisecond = 1000 * 1000;
    const timespec length{milliseconds / 1000, milliseconds % 1000 * kNanosecondsPerMillisecond};
    ::nanosleep(&length, nullptr);
}

}  // namespace

void shortPause() {
    sleepFor(kLongestStep);
}

pid_t pollChild(pid_t pid, int& status) {
    pid_t ended;
    do {
        ended = ::waitpid(pid, &status, WNOHANG);
    } while (ended == -1 && errno == EINTR);
    return ended;
}

void ChildWatch::pause(int milliseconds) {
    if (!asked_) {
        asked_ = true;
        handle_ = FileDescriptor(static_cast<int>(::syscall(kPidfdOpen, pid_, 0)));
    }
    if (!handle_.isOpen()) {
        pauseWithoutHandle(milliseconds);
        return;
    }
    pollfd end{handle_.get(), POLLIN, 0};
    if (::poll(&end, 1, milliseconds) == -1 && errno != EINTR) pauseWithoutHandle(milliseconds);
}

void ChildWatch::pauseWithoutHandle(int milliseconds) {
    sleepFor(std::min(step_, milliseconds));
    step_ = std::min(2 * step_, kLongestStep);
}

void reapLater(pid_t pid) noexcept {
    try {
        const std::lock_guard<std::mutex> lock(forgotten().mutex);
        forgotten().children.push_back(pid);
    } catch (...) {
        // No memory for its id: the child stays a zombie until this process ends.
    }
}

void reapForgotten() noexcept {
    const std::lock_guard<std::mutex> lock(forgotten().mutex);
    auto& children = forgotten().children;
    const auto ended = [](pid_t pid) {
        int status = 0;
        return pollChild(pid, status) != 0;
    };
    children.erase(std::remove_if(children.begin(), children.end(), ended), children.end());
}

}  // namespace ZAV
