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

    Mailbox() = default;
    /// `onLetter` is called after each letter that was put in, by the thread that has done so. It
    /// must return soon and throw nothing. For a loop that empties many mailboxes and so can wait
    /// at none.
    explicit Mailbox(std::function<void()> onLetter) : onLetter_(std::move(onLetter)) {}

    void put(Letter letter) {
        {
            const std::lock_guard lock(mutex_);
            if (isClosed_) return;
            letters_.push_back(std::move(letter));
        }
        changed_.notify_one();
        if (onLetter_) onLetter_();
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
    const std::function<void()> onLetter_;
    std::mutex mutex_;
    std::condition_variable changed_;
    std::deque<Letter> letters_;
    bool isClosed_ = false;
};

}  // namespace fleet
