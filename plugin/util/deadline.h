/// A point in time that no change of the system's date moves.
#pragma once

#include <algorithm>
#include <chrono>

namespace ZAV {

/// When a run of a command has had its time. On the monotonic clock, so that a date that jumps
/// neither ends a run early nor makes it endless.
class Deadline {
public:
    /// `seconds` from now; 0 and less have passed at once.
    static Deadline in(int seconds) {
        return Deadline(Clock::now() + std::chrono::seconds(seconds));
    }

    bool passed() const { return Clock::now() >= at_; }

    /// What is left in whole milliseconds, rounded up, 0 to `atMost`: the time-out of a poll.
    int millisecondsLeft(int atMost) const {
        const long long left =
            std::chrono::ceil<std::chrono::milliseconds>(at_ - Clock::now()).count();
        return static_cast<int>(std::clamp<long long>(left, 0, atMost));
    }

private:
    using Clock = std::chrono::steady_clock;
    explicit Deadline(Clock::time_point at) : at_(at) {}

    Clock::time_point at_;
};

}  // namespace ZAV
