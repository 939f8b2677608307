/// A mutex that clang watches: members that it guards say so, and -Wthread-safety refuses code that
/// uses them without it. The standard library's mutex carries no such marks. For other compilers
/// this is std::mutex and nothing more.
#pragma once

#include <condition_variable>
#include <mutex>

// Attributes cannot be made by functions; these are all the macros there are for them.
#if defined(__clang__)
#define ZAV_THREAD_SAFETY(attribute) __attribute__((attribute))
#else
#define ZAV_THREAD_SAFETY(attribute)
#endif
/// Behind a member: to be read and written only with the mutex held.
#define ZAV_GUARDED_BY(mutex) ZAV_THREAD_SAFETY(guarded_by(mutex))
/// Behind a function: to be called only with the mutex held.
#define ZAV_REQUIRES(mutex) ZAV_THREAD_SAFETY(requires_capability(mutex))

namespace embedded {

class ZAV_THREAD_SAFETY(capability("mutex")) Mutex {
public:
    Mutex() = default;
    Mutex(const Mutex&) = delete;
    Mutex& operator=(const Mutex&) = delete;

private:
    friend class MutexLock;
    std::mutex mutex_;
};

/// Holds a mutex from its construction to its end, but for what lies between unlock() and lock().
class ZAV_THREAD_SAFETY(scoped_lockable) MutexLock {
public:
    explicit MutexLock(Mutex& mutex) ZAV_THREAD_SAFETY(acquire_capability(mutex))
        : lock_(mutex.mutex_) {}
    ~MutexLock() ZAV_THREAD_SAFETY(release_capability()) {}
    MutexLock(const MutexLock&) = delete;
    MutexLock& operator=(const MutexLock&) = delete;

    void unlock() ZAV_THREAD_SAFETY(release_capability()) { lock_.unlock(); }
    void lock() ZAV_THREAD_SAFETY(acquire_capability()) { lock_.lock(); }
    /// Lets the mutex go until the condition is notified, or for no reason at all; so callers loop.
    void wait(std::condition_variable& condition) { condition.wait(lock_); }

private:
    std::unique_lock<std::mutex> lock_;
};

}  // namespace embedded
