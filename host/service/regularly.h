/// Something that is done again and again beside everything else.
#pragma once

#include <chrono>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <thread>

namespace host {

/// A thread that calls a function at once and then each time that this time has passed.
class Regularly {
public:
    /// `act` must not throw.
    Regularly(std::chrono::milliseconds every, std::function<void()> act);
    /// Calls stop().
    ~Regularly();
    Regularly(const Regularly&) = delete;
    Regularly& operator=(const Regularly&) = delete;

    /// No further call. Waits for one in progress.
    void stop();

private:
    void work();

    const std::chrono::milliseconds every_;
    const std::function<void()> act_;

    std::mutex lock_;  // around the flag
    std::condition_variable changed_;
    bool stopping_ = false;

    std::thread thread_;  ///< last, so that it finds everything else
};

}  // namespace host
