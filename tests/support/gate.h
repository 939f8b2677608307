/// Lets one thread hold up another.
#pragma once

#include <chrono>
#include <condition_variable>
#include <mutex>

class Gate {
public:
    /// Blocks until the gate is open. Says so to awaitArrival() first.
    void pass() {
        std::unique_lock<std::mutex> lock(lock_);
        ++arrived_;
        changed_.notify_all();
        changed_.wait(lock, [this] { return open_; });
    }
    void open() {
        const std::lock_guard<std::mutex> lock(lock_);
        open_ = true;
        changed_.notify_all();
    }
    /// Waits until `count` calls of pass() have begun; false when that takes too long.
    bool awaitArrival(int count = 1) {
        std::unique_lock<std::mutex> lock(lock_);
        return changed_.wait_for(lock, std::chrono::seconds(30),
                                 [this, count] { return arrived_ >= count; });
    }

private:
    std::mutex lock_;
    std::condition_variable changed_;
    bool open_ = false;
    int arrived_ = 0;
};
