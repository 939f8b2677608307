/// A point in time that does not move when the system's clock is set.
#pragma once

#include <algorithm>
#include <chrono>

namespace ZAV {

/// The end of a command's time-out. Uses the monotonic clock, so that setting the system's clock
/// neither ends a run early nor makes it endless.
class Deadline {
public:
    /// `seconds` from now. With 0 or less it has passed already.
    static Deadline in(int seconds) {
        return Deadline(Clock::now() + std::chrono::seconds(seconds));
    }

    bool passed() const { return Clock::now() >= at_; }

    /// The time left in whole milliseconds, rounded up, from 0 to `atMost`: a time-out for poll.
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
