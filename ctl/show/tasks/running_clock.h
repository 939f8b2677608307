/// A clock on the terminal while a command runs.
#pragma once

#include <chrono>
#include <string>

namespace ctl {

/// "3 s" or "2 min 5 s".
std::string elapsedText(std::chrono::milliseconds time);

/// A line on standard error that counts the seconds of a wait, and is erased at the end. Shows
/// nothing when standard error is no terminal, or when it is not enabled.
class RunningClock {
public:
    /// `what` says what is waited for, such as "start ux". The clock starts now.
    RunningClock(std::string what, bool enabled);
    ~RunningClock();
    RunningClock(const RunningClock&) = delete;
    RunningClock& operator=(const RunningClock&) = delete;

    /// Draws the line anew.
    void tick();
    /// Takes the line off the terminal, before something else is printed.
    void erase();

private:
    std::string what_;
    bool enabled_;
    bool shown_ = false;
    std::chrono::steady_clock::time_point start_ = std::chrono::steady_clock::now();
};

}  // namespace ctl
