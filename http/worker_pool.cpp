#include "http/worker_pool.h"

#include <stdexcept>
#include <string>
#include <system_error>
#include <utility>

namespace http {

WorkerPool::WorkerPool(std::size_t threads, std::size_t queueLimit) : queueLimit_(queueLimit) {
    try {
        for (std::size_t i = 0; i < threads; ++i)
            threads_.emplace_back([this] { work(); });
    } catch (const std::system_error& error) {
        stop();
        throw std::runtime_error(std::string("cannot start a thread: ") + error.what());
    }
    // Each thread counts itself as free. Wait for all, so that nobody meets a pool without free
    // ones.
    embedded::MutexLock lock(lock_);
    while (idle_ != threads)
        lock.wait(changed_);
}

WorkerPool::~WorkerPool() {
    stop();
}

void WorkerPool::stop() {
    std::deque<Job> dropped;
    {
        const embedded::MutexLock lock(lock_);
        stopping_ = true;
        dropped.swap(queue_);
    }
    changed_.notify_all();
    for (std::thread& thread : threads_)
        thread.join();
    threads_.clear();
}

bool WorkerPool::submit(Job job) {
    {
        const embedded::MutexLock lock(lock_);
        // A job that a free thread is about to take is not waiting.
        if (stopping_ || queue_.size() >= queueLimit_ + idle_) return false;
        queue_.push_back(std::move(job));
    }
    changed_.notify_one();
    return true;
}

void WorkerPool::work() {
    embedded::MutexLock lock(lock_);
    ++idle_;
    changed_.notify_all();
    while (true) {
        while (!stopping_ && queue_.empty())
            lock.wait(changed_);
        if (stopping_) return;
        Job job = std::move(queue_.front());
        queue_.pop_front();
        --idle_;
        lock.unlock();
        try {
            job();
        } catch (...) {
            // Jobs report their own failures.
        }
        job = nullptr;  // release what it holds before waiting again
        lock.lock();
        ++idle_;
    }
}

}  // namespace http
