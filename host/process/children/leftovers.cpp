#include "host/process/children/leftovers.h"

#include <signal.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <map>
#include <optional>
#include <thread>

#include "host/process/children/process_table.h"

namespace host {
namespace {

constexpr const char* kVariable = "ZAVHOST_RUN";

/// Not so of the kernel's own, of those that have ended, and of those of others.
bool executesAProgram(pid_t pid) {
    char name[1];
    return ::readlink(("/proc/" + std::to_string(pid) + "/exe").c_str(), name, sizeof name) > 0;
}

/// The environment that a process was started with; empty when it may not be read.
std::string environmentOf(pid_t pid) {
    constexpr int kLooks = 20;
    for (int look = 1;; ++look) {
        std::ifstream file("/proc/" + std::to_string(pid) + "/environ", std::ios::binary);
        std::string text{std::istreambuf_iterator<char>(file), {}};
        if (!text.empty() || look == kLooks || !executesAProgram(pid)) return text;
        // It looks empty while the process begins to execute its next program.
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
}

std::string markOf(const std::string& journal) {
    return std::string(kVariable) + '=' + journal + '-';
}

/// "RUN-SESSION" from the mark in an environment; nothing if there is none of this journal.
std::optional<std::string> runIn(const std::string& environment, const std::string& mark) {
    const std::string text = '\0' + environment;
    const std::size_t at = text.find('\0' + mark);
    if (at == std::string::npos) return std::nullopt;
    const std::size_t begin = at + 1 + mark.size();
    return text.substr(begin, text.find('\0', begin) - begin);
}

pid_t sessionIn(const std::string& run) {
    return static_cast<pid_t>(std::atol(run.substr(run.find('-') + 1).c_str()));
}

}  // namespace

Leftovers::Leftovers(const std::string& journal, long long run, const std::string& formerJournal)
    : mark_(markOf(journal)),
      former_(formerJournal.empty() ? std::string() : markOf(formerJournal)),
      ownRun_(std::to_string(run) + '-' + std::to_string(::getsid(0))) {
    ::setenv(kVariable, (journal + '-' + ownRun_).c_str(), 1);
}

/// "RUN-SESSION" of an earlier run that left a process with this environment; nothing if none did.
std::optional<std::string> Leftovers::runOf(const std::string& environment) const {
    std::optional<std::string> run = runIn(environment, mark_);
    if (run && *run == ownRun_) return std::nullopt;
    if (!run && !former_.empty()) run = runIn(environment, former_);
    return run;
}

std::vector<pid_t> Leftovers::alive() const {
    const std::vector<ProcessEntry> processes = readProcesses();
    std::map<pid_t, pid_t> sessions;  // of those that are left over, the session of their host
    for (const ProcessEntry& process : processes) {
        if (!process.isAlive || process.pid == ::getpid()) continue;
        const auto run = runOf(environmentOf(process.pid));
        if (run) sessions[process.pid] = sessionIn(*run);
    }
    // Descendants that have another environment: a generation in each round.
    for (bool grows = !sessions.empty(); grows;) {
        grows = false;
        for (const ProcessEntry& process : processes) {
            const auto parent = sessions.find(process.parent);
            if (parent == sessions.end() || !process.isAlive) continue;
            grows = sessions.emplace(process.pid, parent->second).second || grows;
        }
    }
    std::vector<pid_t> found;
    for (const ProcessEntry& process : processes) {
        const auto leftOver = sessions.find(process.pid);
        if (leftOver == sessions.end() || process.pid == ::getpid()) continue;
        if (process.session == leftOver->second) found.push_back(process.pid);
    }
    return found;
}

bool Leftovers::gone() const {
    if (!gone_ && alive().empty()) gone_ = true;
    return gone_;
}

void Leftovers::end(int signal) const {
    for (const pid_t pid : alive())
        ::kill(pid, signal);
}

}  // namespace host
