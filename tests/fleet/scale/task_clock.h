/// When the tasks of simulated hosts end: one thread for all of them.
#pragma once

#include <chrono>
#include <condition_variable>
#include <functional>
#include <map>
#include <mutex>
#include <thread>
#include <utility>

namespace fleet_scale {

class TaskClock {
public:
    using Time = std::chrono::steady_clock::time_point;

    TaskClock() : thread_([this] { run(); }) {}
    /// What was to happen later never does.
    ~TaskClock() {
        {
            const std::lock_guard lock(mutex_);
            isEnding_ = true;
        }
        changed_.notify_all();
        thread_.join();
    }
    TaskClock(const TaskClock&) = delete;
    TaskClock& operator=(const TaskClock&) = delete;

    /// Calls it then, on the clock's thread. It must return soon and throw nothing.
    void at(Time then, std::function<void()> act) {
        {
            const std::lock_guard lock(mutex_);
            acts_.emplace(then, std::move(act));
        }
        changed_.notify_all();
    }

private:
    void run() {
        std::unique_lock lock(mutex_);
        while (!isEnding_) {
            if (acts_.empty()) {
                changed_.wait(lock);
            } else if (acts_.begin()->first > std::chrono::steady_clock::now()) {
                changed_.wait_until(lock, Time(acts_.begin()->first));
            } else {
                const auto act = std::move(acts_.begin()->second);
                acts_.erase(acts_.begin());
                lock.unlock();
                act();
                lock.lock();
            }
        }
    }

    std::mutex mutex_;
    std::condition_variable changed_;
    std::multimap<Time, std::function<void()>> acts_;
    bool isEnding_ = false;
    std::thread thread_;  ///< last: it uses everything above
};

}  // namespace fleet_scale
