#include "host/process/children/descendants.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <iterator>

#include "host/process/children/orphans.h"

namespace host {
namespace {

/// A process that starts others faster than they can be killed does not hold the caller up for
/// ever.
constexpr int kMostRounds = 1000;
constexpr int kQuietLooks = 3;

bool contains(const std::vector<pid_t>& pids, pid_t pid) {
    return std::find(pids.begin(), pids.end(), pid) != pids.end();
}

}  // namespace

Descendants::Descendants(std::vector<pid_t> orphansBefore)
    : orphansBefore_(std::move(orphansBefore)), session_(::getsid(0)) {}

void Descendants::look(pid_t command, bool itself) {
    command_ = command;
    const std::size_t knownBefore = known_.size();
    sawTraces_ = false;
    processes_ = readProcesses();
    const std::vector<pid_t> orphansNow = orphansOfLook();
    if (itself) addCommand();
    while (addGeneration(orphansNow)) {
    }
    sawTraces_ = sawTraces_ || known_.size() != knownBefore;
}

/// The table has nobody who started while it was read. In a line of processes of which each starts
/// the next one and ends, there is one orphan that lives at any moment, and this finds it.
std::vector<pid_t> Descendants::orphansOfLook() {
    std::vector<pid_t> found = orphans();
    if (!adoptsOrphans()) return found;
    std::vector<pid_t> gone;
    for (const ProcessEntry& process : processes_) {
        if (process.parent == ::getpid() && !contains(found, process.pid)) {
            gone.push_back(process.pid);
        }
    }
    for (const pid_t orphan : found) {
        if (isInTable(orphan)) continue;
        const std::optional<ProcessEntry> process = readProcess(orphan);
        if (process) processes_.push_back(*process);
        sawTraces_ = sawTraces_ || !process;
    }
    if (gone.empty()) return found;
    const std::vector<pid_t> inHand = commands();
    std::copy_if(gone.begin(), gone.end(), std::back_inserter(found),
                 [&](pid_t pid) { return !contains(inHand, pid); });
    return found;
}

bool Descendants::isInTable(pid_t pid) const {
    return std::any_of(processes_.begin(), processes_.end(),
                       [pid](const ProcessEntry& process) { return process.pid == pid; });
}

/// Only a child of this process can be the command: any other has got its id since.
void Descendants::addCommand() {
    for (const ProcessEntry& process : processes_) {
        if (process.pid != command_ || process.parent != ::getpid()) continue;
        if (process.session == session_) known_.insert(nameOf(process));
    }
}

bool Descendants::hasKnownParent(const ProcessEntry& process) const {
    const auto at = known_.lower_bound({process.parent, 0});
    return (command_ != 0 && process.parent == command_) ||
           (at != known_.end() && at->first == process.parent);
}

/// True when there was something to add.
bool Descendants::addGeneration(const std::vector<pid_t>& orphansNow) {
    bool added = false;
    for (const ProcessEntry& process : processes_) {
        if (process.session != session_ || process.pid == command_) continue;
        const bool isNewOrphan =
            contains(orphansNow, process.pid) && !contains(orphansBefore_, process.pid);
        if (!isNewOrphan && !hasKnownParent(process)) continue;
        added = known_.insert(nameOf(process)).second || added;
    }
    return added;
}

std::size_t Descendants::send(int signal) {
    std::size_t reached = 0;
    for (const ProcessEntry& process : processes_) {
        if (!process.isAlive || !isKnown(process)) continue;
        const bool first = signalled_.insert(nameOf(process)).second;
        if (!first && signal != SIGKILL) continue;
        // What may not be killed belongs to another user, as root started it; it is not ours.
        if (::kill(process.pid, signal) == 0) ++reached;
    }
    return reached;
}

bool Descendants::kill() {
    bool found = sawTraces_;
    for (const ProcessEntry& process : processes_) {
        if (!process.isAlive || !isKnown(process)) continue;
        // One that has ended since the look may have started others before.
        if (::kill(process.pid, SIGKILL) == 0 || errno == ESRCH) found = true;
    }
    quietLooks_ = found ? 0 : quietLooks_ + 1;
    return quietLooks_ < kQuietLooks;
}

std::size_t Descendants::living() const {
    return static_cast<std::size_t>(std::count_if(
        processes_.begin(), processes_.end(),
        [this](const ProcessEntry& process) { return process.isAlive && isKnown(process); }));
}

void killDescendants(pid_t command, const std::vector<pid_t>& orphansBefore) {
    if (command <= 0) return;
    ::kill(command, SIGSTOP);
    Descendants descendants(orphansBefore);
    for (int round = 0; round < kMostRounds; ++round) {
        descendants.look(command, false);
        if (!descendants.kill()) return;
    }
}

}  // namespace host
