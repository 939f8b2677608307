/// Threads for what may take long: samples that sleep or run children.
#pragma once

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <thread>
#include <vector>

#include "embedded/mutex.h"

namespace host {

/// A fixed number of threads behind a bounded queue. All threads are there from the start, so that
/// load changes neither their number nor what they occupy.
class WorkerPool {
public:
    using Job = std::function<void()>;

    /// Throws StartError when the system gives too few threads.
    WorkerPool(std::size_t threads, std::size_t queueLimit);
    /// Drops the jobs that wait and returns when the running ones have ended.
    ~WorkerPool();
    WorkerPool(const WorkerPool&) = delete;
    WorkerPool& operator=(const WorkerPool&) = delete;

    /// False when as many jobs wait as may wait; `job` has not been taken then. What a job throws
    /// is dropped. Any thread.
    bool submit(Job job);

private:
    void work();
    void stop();

    const std::size_t queueLimit_;
    embedded::Mutex lock_;
    std::condition_variable changed_;
    std::deque<Job> queue_ ZAV_GUARDED_BY(lock_);
    std::size_t idle_ ZAV_GUARDED_BY(lock_) = 0;
    bool stopping_ ZAV_GUARDED_BY(lock_) = false;

    std::vector<std::thread> threads_;  // constant after construction
};

}  // namespace host
