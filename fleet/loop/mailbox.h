/// What other threads have to tell to a loop.
#pragma once

#include <chrono>
#include <condition_variable>
#include <deque>
#include <functional>
#include <mutex>
#include <optional>
#include <utility>

namespace fleet {

/// Letters are read in the order in which they were put in. Any thread may put some in.
class Mailbox {
public:
    using Letter = std::function<void()>;
    using Clock = std::chrono::steady_clock;

    void put(Letter letter) {
        {
            const std::lock_guard lock(mutex_);
            if (isClosed_) return;
            letters_.push_back(std::move(letter));
        }
        changed_.notify_one();
    }

    /// Drops what is in it, and all that is put in from now on.
    void close() {
        std::deque<Letter> dropped;
        {
            const std::lock_guard lock(mutex_);
            isClosed_ = true;
            dropped.swap(letters_);
        }
    }

    /// The next one; nothing if none has come by then.
    std::optional<Letter> take(Clock::time_point until) {
        std::unique_lock lock(mutex_);
        if (!changed_.wait_until(lock, until, [this] { return !letters_.empty(); })) {
            return std::nullopt;
        }
        Letter first = std::move(letters_.front());
        letters_.pop_front();
        return first;
    }

private:
    std::mutex mutex_;
    std::condition_variable changed_;
    std::deque<Letter> letters_;
    bool isClosed_ = false;
};

}  // namespace fleet
