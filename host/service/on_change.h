/// Something that is done when something has changed.
#pragma once

#include <chrono>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <thread>

namespace host {

/// A thread that calls a function at once and then after each change, but not sooner than a pause
/// after the last time: many changes make one call. While nothing changes the thread sleeps.
class OnChange {
public:
    /// `act` returns whether it has succeeded: if not, it is called again after the pause. It must
    /// not throw.
    OnChange(std::chrono::milliseconds pause, std::function<bool()> act);
    /// Calls stop().
    ~OnChange();
    OnChange(const OnChange&) = delete;
    OnChange& operator=(const OnChange&) = delete;

    /// Something has changed. Never waits. Any thread.
    void changed();
    /// No further call. Waits for one in progress.
    void stop();

private:
    void work();

    const std::chrono::milliseconds pause_;
    const std::function<bool()> act_;

    std::mutex lock_;  // around the flags
    std::condition_variable woken_;
    bool changed_ = true;
    bool stopping_ = false;

    std::thread thread_;  ///< last, so that it finds everything else
};

}  // namespace host
