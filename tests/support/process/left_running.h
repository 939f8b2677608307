/// Processes that commands leave behind, for tests of who waits for them.
#pragma once

#include <signal.h>

#include <cstdlib>
#include <string>

#include "support/scratch_dir.h"

/// A process that a shell command starts and leaves behind with its outputs open. Ended with the
/// object, and at the latest after a minute.
class LeftRunning {
public:
    LeftRunning() = default;
    ~LeftRunning() {
        if (isRunning()) ::kill(pid(), SIGKILL);
    }
    LeftRunning(const LeftRunning&) = delete;
    LeftRunning& operator=(const LeftRunning&) = delete;

    /// Starts the process when a shell runs it.
    std::string command() const { return "sleep 60 & echo $! >" + scratch_.path("pid") + ";"; }
    /// Also false until a shell has run command() completely.
    bool isRunning() const { return pid() > 0 && ::kill(pid(), 0) == 0; }

private:
    pid_t pid() const { return std::atoi(scratch_.read("pid").c_str()); }

    ScratchDir scratch_;
};

/// A piece of shell script that waits until there is a file of that name, for a minute at most.
inline std::string untilReleased(const std::string& file) {
    return "n=0\nuntil [ -e '" + file +
           "' ] || [ $n -gt 12000 ]; do n=$((n + 1)); sleep 0.05; done\n";
}
