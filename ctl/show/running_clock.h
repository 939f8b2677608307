/// What a person at a terminal sees while a command runs.
#pragma once

#include <chrono>
#include <string>

namespace ctl {

/// A line on standard error that counts the seconds of a wait. Shows nothing when standard error is
/// no terminal or the command's output is for a program. Erased when it ends.
class RunningClock {
public:
    RunningClock(std::string what, bool enabled);
    ~RunningClock();
    RunningClock(const RunningClock&) = delete;
    RunningClock& operator=(const RunningClock&) = delete;

    void tick();
    /// Takes the line off the terminal before something else is printed.
    void erase();
    /// "3 s" or "2 min 5 s" since the clock was made.
    std::string elapsed() const;

private:
    std::string what_;
    bool enabled_;
    bool shown_ = false;
    std::chrono::steady_clock::time_point start_ = std::chrono::steady_clock::now();
};

}  // namespace ctl
