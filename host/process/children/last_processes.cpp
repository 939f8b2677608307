#include "host/process/children/last_processes.h"

#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <set>
#include <utility>
#include <vector>

#include "host/process/children/pidfd.h"
#include "host/process/children/process_table.h"

namespace host {
namespace {

using Clock = std::chrono::steady_clock;

std::vector<ProcessEntry> othersThatLive() {
    std::vector<ProcessEntry> found = readProcesses();
    found.erase(std::remove_if(found.begin(), found.end(),
                               [](const ProcessEntry& process) {
                                   return !process.isAlive || process.pid == ::getpid();
                               }),
                found.end());
    return found;
}

/// Kills those of them that have the session of this process, and leaves the others in the list.
void killOwnSession(std::vector<ProcessEntry>& processes) {
    const auto others = std::stable_partition(
        processes.begin(), processes.end(),
        [ours = ::getsid(0)](const ProcessEntry& process) { return process.session != ours; });
    std::for_each(others, processes.end(),
                  [](const ProcessEntry& process) { ::kill(process.pid, SIGKILL); });
    processes.erase(others, processes.end());
}

/// Returns when one of them has ended, and after a short while in any case: a process may start
/// another one.
void awaitEndOfOne(const std::vector<ProcessEntry>& processes, Clock::time_point end) {
    constexpr std::chrono::milliseconds kNextLook{100};
    std::vector<sys::FileDescriptor> descriptors;
    std::vector<pollfd> watched;
    for (const ProcessEntry& process : processes) {
        descriptors.push_back(openPidfd(process.pid));
        // poll() passes over the number of none.
        watched.push_back({descriptors.back().get(), POLLIN, 0});
    }
    const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(end - Clock::now());
    const auto wait = std::clamp(left, std::chrono::milliseconds(0), kNextLook);
    ::poll(watched.data(), watched.size(), static_cast<int>(wait.count()));
}

}  // namespace

std::size_t endLastProcesses(std::chrono::milliseconds patience) {
    if (::getpid() != 1) return 0;
    const Clock::time_point end = Clock::now() + patience;
    std::set<std::pair<pid_t, unsigned long long>> told;
    for (;;) {
        std::vector<ProcessEntry> living = othersThatLive();
        killOwnSession(living);  // each time: a task may begin its next command
        if (living.empty() || Clock::now() >= end) return living.size();
        for (const ProcessEntry& process : living) {
            if (told.emplace(process.pid, process.start).second) ::kill(process.pid, SIGTERM);
        }
        awaitEndOfOne(living, end);
    }
}

}  // namespace host
