/// Runs a program for the host itself and hears what it says.
#pragma once

#include <chrono>
#include <cstddef>
#include <string>
#include <vector>

namespace host {

/// What a program may take.
struct CommandLimits {
    std::chrono::milliseconds time{30'000};
    std::size_t output = 1024 * 1024;  ///< bytes of each of its two outputs
};

/// How a program ended, and what it wrote until then.
struct CommandResult {
    enum class End {
        Exited,      ///< `number` is its exit code
        Signalled,   ///< `number` is the signal that ended it
        TimedOut,    ///< it was killed when its time was over
        TooLong,     ///< it was killed because it wrote more than it may
        NotStarted,  ///< `number` is an errno value
    };
    End end = End::NotStarted;
    int number = 0;
    std::string out;
    std::string err;

    bool succeeded() const { return end == End::Exited && number == 0; }
};

/// Runs argv[0], an absolute path, with the host's environment and an empty standard input, in a
/// process group of its own, and waits until it has ended. No other child inherits its pipes.
/// Processes that it leaves behind are not waited for, even when they hold its outputs; what is
/// killed is the whole group. The child is reaped by its id alone. Any thread; no lock is held and
/// no signal is blocked meanwhile.
CommandResult runCommand(const std::vector<std::string>& argv, const CommandLimits& limits = {});

/// How it ended, in words: "ended with exit code 3", "was killed by signal 9", ...
std::string endInWords(const CommandResult& result);

}  // namespace host
