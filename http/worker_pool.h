/// Threads for work that may take long.
#pragma once

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <thread>
#include <vector>

#include "embedded/mutex.h"

namespace http {

/// A fixed number of threads behind a bounded queue. All threads exist from the start, so load
/// changes neither their number nor their memory.
class WorkerPool {
public:
    using Job = std::function<void()>;

    /// Throws std::runtime_error when the system gives too few threads.
    WorkerPool(std::size_t threads, std::size_t queueLimit);
    /// Drops the waiting jobs and waits for the running ones.
    ~WorkerPool();
    WorkerPool(const WorkerPool&) = delete;
    WorkerPool& operator=(const WorkerPool&) = delete;

    /// Queues the job. Returns false, and drops it, when the queue is full. Exceptions of a job are
    /// ignored. Any thread.
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

}  // namespace http
