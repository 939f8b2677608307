#include "host/commands/child_end.h"

#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <ctime>

#include "host/process/children/pidfd.h"
#include "system/file_descriptor.h"

namespace host {
namespace {

using Clock = std::chrono::steady_clock;

// Older C libraries do not have this name.
constexpr auto kPidfd = static_cast<idtype_t>(3);

/// Milliseconds, rounded up, for poll.
int timeLeft(Clock::time_point until) {
    constexpr long long kLongest = 60 * 1000;  // the time may be further off
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(until - Clock::now()).count();
    return static_cast<int>(std::clamp<long long>(left, 0, kLongest));
}

/// What one look finds.
struct Look {
    bool over = true;  ///< there is nothing to wait for
    std::optional<ChildEnd> end;
};

Look look(idtype_t kind, id_t id) {
    siginfo_t found{};
    if (::waitid(kind, id, &found, WEXITED | WNOWAIT | WNOHANG) != 0) return {};
    if (found.si_pid == 0) return {false, std::nullopt};
    return {true, ChildEnd{found.si_code != CLD_EXITED, found.si_status}};
}

/// For systems without handles of processes: looks again and again.
std::optional<ChildEnd> awaitByLooking(pid_t child, Clock::time_point until) {
    constexpr int kLongestStep = 20;  // milliseconds
    for (int step = 1;; step = std::min(2 * step, kLongestStep)) {
        const Look found = look(P_PID, static_cast<id_t>(child));
        if (found.over || Clock::now() >= until) return found.end;
        const timespec pause{0, std::min(step, timeLeft(until)) * 1000L * 1000L};
        ::nanosleep(&pause, nullptr);
    }
}

}  // namespace

std::optional<ChildEnd> awaitChildEnd(pid_t child, Clock::time_point until) {
    const Look found = look(P_PID, static_cast<id_t>(child));
    if (found.over || Clock::now() >= until) return found.end;
    const sys::FileDescriptor handle = openPidfd(child);
    if (handle.get() == -1) return awaitByLooking(child, until);
    pollfd ended{handle.get(), POLLIN, 0};
    while (::poll(&ended, 1, timeLeft(until)) <= 0 && Clock::now() < until) {
    }
    return look(kPidfd, static_cast<id_t>(handle.get())).end;
}

}  // namespace host
