#include "host/process/children/orphans.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <csignal>
#include <set>
#include <string>
#include <system_error>

#include "host/process/children/process_table.h"
#include "host/process/file_descriptor.h"
#include "host/process/start_error.h"

namespace host {
namespace {

/// A process that starts others faster than they can be killed does not hold the caller up for
/// ever.
constexpr int kMostRounds = 200;

bool contains(const std::vector<pid_t>& pids, pid_t pid) {
    return std::find(pids.begin(), pids.end(), pid) != pids.end();
}

/// The numbers in a text, which blanks separate.
std::vector<pid_t> numbersIn(const std::string& text) {
    std::vector<pid_t> numbers;
    const char* at = text.data();
    const char* const end = at + text.size();
    while (at != end) {
        pid_t number = 0;
        const auto [rest, error] = std::from_chars(at, end, number);
        if (error == std::errc()) numbers.push_back(number);
        at = error == std::errc() ? rest : at + 1;
    }
    return numbers;
}

/// The processes below one command.
class Descendants {
public:
    Descendants(pid_t command, const std::vector<pid_t>& orphansBefore)
        : command_(command), orphansBefore_(orphansBefore), session_(::getsid(0)) {}

    /// Kills those that live. False when none does.
    bool killLiving() {
        const std::vector<pid_t> orphansNow = orphans();
        const std::vector<ProcessEntry> processes = readProcesses();
        while (addChildren(processes, orphansNow)) {
        }
        bool found = false;
        for (const ProcessEntry& process : processes) {
            if (!process.isAlive || !isKnown(process.pid, process.start)) continue;
            // What may not be killed belongs to another user, as root started it; it is not ours.
            if (::kill(process.pid, SIGKILL) == 0) found = true;
        }
        return found;
    }

private:
    bool isKnown(pid_t pid, unsigned long long start) const {
        return known_.count({pid, start}) != 0;
    }
    bool hasKnownParent(const ProcessEntry& process) const {
        const auto at = known_.lower_bound({process.parent, 0});
        return process.parent == command_ || (at != known_.end() && at->first == process.parent);
    }
    /// Adds what has a known parent. True when there was something to add.
    bool addChildren(const std::vector<ProcessEntry>& processes,
                     const std::vector<pid_t>& orphansNow) {
        bool added = false;
        for (const ProcessEntry& process : processes) {
            if (process.session != session_ || process.pid == command_) continue;
            const bool isNewOrphan =
                contains(orphansNow, process.pid) && !contains(orphansBefore_, process.pid);
            if (!isNewOrphan && !hasKnownParent(process)) continue;
            added = known_.insert({process.pid, process.start}).second || added;
        }
        return added;
    }

    const pid_t command_;
    const std::vector<pid_t>& orphansBefore_;
    const pid_t session_;
    std::set<std::pair<pid_t, unsigned long long>> known_;  ///< process ids and starts
};

}  // namespace

void adoptOrphans() {
    if (::prctl(PR_SET_CHILD_SUBREAPER, 1, 0, 0, 0) != 0) {
        throw StartError("cannot adopt orphans: " + std::generic_category().message(errno));
    }
}

void reapOrphans() {
    for (;;) {
        // Looks first and leaves the process as it is, so that only this very one is reaped.
        siginfo_t ended{};
        const int looked = ::waitid(P_ALL, 0, &ended, WEXITED | WNOHANG | WNOWAIT | __WNOTHREAD);
        if (looked != 0 && errno == EINTR) continue;
        if (looked != 0 || ended.si_pid == 0) return;
        ::waitpid(ended.si_pid, nullptr, WNOHANG | __WNOTHREAD);
    }
}

std::vector<pid_t> orphans() {
    const std::string path = "/proc/self/task/" + std::to_string(::getpid()) + "/children";
    const FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    std::string text;
    std::array<char, 4096> piece{};
    ssize_t length = 0;
    while (file && (length = ::read(file.get(), piece.data(), piece.size())) > 0) {
        text.append(piece.data(), static_cast<std::size_t>(length));
    }
    return numbersIn(text);
}

void killDescendants(pid_t command, const std::vector<pid_t>& orphansBefore) {
    if (command <= 0) return;
    ::kill(command, SIGSTOP);
    Descendants descendants(command, orphansBefore);
    for (int round = 0; round < kMostRounds && descendants.killLiving(); ++round) {
    }
}

}  // namespace host
