#include "soak/weather.h"

#include <signal.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <filesystem>

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

/// The file that a process runs; empty when that cannot be seen.
std::string programOf(pid_t process) {
    std::error_code error;
    return std::filesystem::read_symlink("/proc/" + std::to_string(process) + "/exe", error);
}

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

void Weather::killLeftChildren() const {
    for (const pid_t child : childrenOf(host_.pid()))
        signalChild(host_.pid(), child, SIGKILL);
}

void Weather::killOneChild() {
    const std::vector<pid_t> children = childrenOf(host_.pid());
    if (children.empty()) return;
    const pid_t child = children[world_.chance.below(children.size())];
    // One that is stopped stands still until its time is over. A child that still runs the host's
    // own program shares the host's memory, and the thread that makes it waits for it without a
    // time-out: such a one is not stopped.
    const int signal = world_.chance.oneIn(12) && programOf(child) != programOf(host_.pid())
                           ? SIGSTOP
                           : world_.chance.of({SIGKILL, SIGKILL, SIGTERM, SIGSEGV, SIGHUP});
    if (signalChild(host_.pid(), child, signal)) world_.tally.count("children killed or stopped");
}

}  // namespace soak
