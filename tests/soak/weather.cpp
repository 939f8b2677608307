#include "soak/weather.h"

#include <signal.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "soak/gauges.h"

namespace soak {
namespace {

#ifdef SYS_pidfd_open
constexpr long kPidfdOpen = SYS_pidfd_open;
constexpr long kPidfdSendSignal = SYS_pidfd_send_signal;
#else
constexpr long kPidfdOpen = 434;  // the same numbers on every architecture
constexpr long kPidfdSendSignal = 424;
#endif

/// Sends a signal to a process if it is, beyond any doubt, a child of `parent`.
bool signalChild(pid_t parent, pid_t child, int signal) {
    const int handle = static_cast<int>(::syscall(kPidfdOpen, child, 0));
    if (handle < 0) return false;
    // The handle stands for one process; while its parent is looked up the id cannot be another's.
    const bool sent =
        parentOf(child) == parent && ::syscall(kPidfdSendSignal, handle, signal, nullptr, 0) == 0;
    ::close(handle);
    return sent;
}

}  // namespace

void Weather::pass() {
    const double wall = world_.clock.wall();
    if (world_.clock.stopped()) {
        if (wall >= resumeAt_) clear();
        return;
    }
    if (wall >= nextStop_) {
        nextStop_ = wall + world_.chance.seconds(6, 14);
        resumeAt_ = wall + world_.chance.seconds(0.05, 1.8);
        world_.clock.stop();
        host_.stop();
        world_.tally.count("stops of the host");
    } else if (wall >= nextKill_) {
        nextKill_ = wall + world_.chance.seconds(0.05, 1);
        killOneChild();
    }
}

void Weather::clear() {
    if (!world_.clock.stopped()) return;
    host_.resume();
    world_.clock.resume();
}

void Weather::killOneChild() {
    const std::vector<pid_t> children = childrenOf(host_.pid());
    if (children.empty()) return;
    const pid_t child = children[world_.chance.below(children.size())];
    // One that is stopped stands still until its time is over.
    const int signal = world_.chance.oneIn(12)
                           ? SIGSTOP
                           : world_.chance.of({SIGKILL, SIGKILL, SIGTERM, SIGSEGV, SIGHUP});
    if (signalChild(host_.pid(), child, signal)) world_.tally.count("children killed or stopped");
}

}  // namespace soak
