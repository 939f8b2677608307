/// A mutex for clang's thread safety analysis: members name the mutex that guards them, and
/// -Wthread-safety rejects code that uses them without it. The standard library's mutex has no such
/// annotations. With other compilers this is just std::mutex.
#pragma once

#include <condition_variable>
#include <mutex>

// Only a macro can stand for an attribute.
#if defined(__clang__)
#define ZAV_THREAD_SAFETY(attribute) __attribute__((attribute))
#else
#define ZAV_THREAD_SAFETY(attribute)
#endif
/// After a member: read and written only with the mutex held.
#define ZAV_GUARDED_BY(mutex) ZAV_THREAD_SAFETY(guarded_by(mutex))
/// After a function: called only with the mutex held.
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

/// Holds a mutex during its lifetime, except between unlock() and lock().
class ZAV_THREAD_SAFETY(scoped_lockable) MutexLock {
public:
    explicit MutexLock(Mutex& mutex) ZAV_THREAD_SAFETY(acquire_capability(mutex))
        : lock_(mutex.mutex_) {}
    ~MutexLock() ZAV_THREAD_SAFETY(release_capability()) {}
    MutexLock(const MutexLock&) = delete;
    MutexLock& operator=(const MutexLock&) = delete;

    void unlock() ZAV_THREAD_SAFETY(release_capability()) { lock_.unlock(); }
    void lock() ZAV_THREAD_SAFETY(acquire_capability()) { lock_.lock(); }
    /// Releases the mutex until the condition is notified. Wake-ups may be spurious, so callers
    /// loop.
    void wait(std::condition_variable& condition) { condition.wait(lock_); }

private:
    std::unique_lock<std::mutex> lock_;
};

}  // namespace embedded
