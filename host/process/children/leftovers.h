/// What the commands of an earlier run of the host still do.
#pragma once

#include <sys/types.h>

#include <atomic>
#include <chrono>
#include <csignal>
#include <optional>
#include <string>
#include <vector>

namespace host {

/// Each run of a host sets a mark in its own environment, which its commands inherit: the journal's
/// identity, the number of the run, and the session that the host is in. When a host is killed its
/// commands go on, and what they do must not meet what the next run does.
class Leftovers {
public:
    /// Looks for processes with a mark of this journal, but of another run, or with one of the
    /// former journal, if there was one; and sets the mark of this run. Call it before any command
    /// of this run starts, while no thread looks at the environment.
    Leftovers(const std::string& journal, long long run, const std::string& formerJournal = {});

    /// Whether none of them lives. Once that is so it stays so. Any thread.
    bool gone() const;

    /// Sends them the signal. Any thread.
    void end(int signal = SIGKILL) const;

private:
    std::vector<pid_t> alive() const;
    std::optional<std::string> runOf(const std::string& environment) const;

    const std::string mark_;    ///< "NAME=journal-"
    const std::string former_;  ///< the same of the former journal; empty: there was none
    const std::string ownRun_;  ///< what follows it in the environment of this run
    mutable std::atomic<bool> gone_{false};
};

}  // namespace host
