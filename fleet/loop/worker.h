/// A thread that does one thing after the other.
#pragma once

#include <chrono>
#include <condition_variable>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>

namespace fleet {

/// Jobs run in the order in which they were given, by any thread. A job may throw nothing. The
/// thread comes with the first job: many a worker never gets one.
class Worker {
public:
    using Job = std::function<void()>;

    Worker() = default;
    /// Waits for the job that runs; those behind it are dropped.
    ~Worker() { await(); }
    Worker(const Worker&) = delete;
    Worker& operator=(const Worker&) = delete;

    /// Throws std::system_error if it is the first job and the system has no thread for it.
    void add(Job job) {
        {
            const std::lock_guard lock(mutex_);
            if (isEnding_) return;
            if (!thread_.joinable()) thread_ = std::thread([this] { work(); });
            jobs_.push_back(std::move(job));
        }
        changed_.notify_all();
    }

    /// No further job begins.
    void end() {
        {
            const std::lock_guard lock(mutex_);
            isEnding_ = true;
            jobs_.clear();
        }
        changed_.notify_all();
    }

    /// Ends it and waits for the job that runs. Not from a job.
    void await() {
        end();
        if (thread_.joinable()) thread_.join();
    }

    /// Pauses; shorter when it ends. For jobs, and for other threads of the same owner. Returns
    /// whether it goes on.
    bool pause(std::chrono::milliseconds time) {
        std::unique_lock lock(mutex_);
        return !changed_.wait_for(lock, time, [this] { return isEnding_; });
    }

private:
    void work() {
        std::unique_lock lock(mutex_);
        for (;;) {
            changed_.wait(lock, [this] { return isEnding_ || !jobs_.empty(); });
            if (isEnding_) return;
            const Job job = std::move(jobs_.front());
            jobs_.pop_front();
            lock.unlock();
            job();
            lock.lock();
        }
    }

    std::mutex mutex_;
    std::condition_variable changed_;
    std::deque<Job> jobs_;
    bool isEnding_ = false;
    std::thread thread_;  ///< last: it uses everything above
};

}  // namespace fleet
