/// Time as the host experiences it: it stands still while the host is stopped.
#pragma once

#include <chrono>

namespace soak {

class HostClock {
public:
    /// Seconds since the clock was made, whether the host was stopped or not.
    double wall() const {
        return std::chrono::duration<double>(std::chrono::steady_clock::now() - start_).count();
    }
    /// Seconds in which the host ran.
    double now() const { return (stopped_ ? stoppedAt_ : wall()) - lost_; }

    bool stopped() const { return stopped_; }
    void stop() {
        stopped_ = true;
        stoppedAt_ = wall();
    }
    void resume() {
        lost_ += wall() - stoppedAt_;
        stopped_ = false;
    }

private:
    std::chrono::steady_clock::time_point start_ = std::chrono::steady_clock::now();
    bool stopped_ = false;
    double stoppedAt_ = 0;
    double lost_ = 0;
};

}  // namespace soak
