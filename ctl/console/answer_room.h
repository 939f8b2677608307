/// How much of what hosts and centres answer is held for browsers.
#pragma once

#include <atomic>
#include <cstddef>
#include <memory>
#include <utility>

#include "http/reply.h"

namespace console {

/// An answer is held as a whole until the browser has taken it. A page that asks for many long ones
/// at a time must not take all of the machine's memory. Any thread.
class AnswerRoom {
    using Count = std::shared_ptr<std::atomic<std::size_t>>;

public:
    static constexpr std::size_t kMost = std::size_t{128} << 20;

    explicit AnswerRoom(std::size_t most = kMost) : most_(most) {}

    /// What one answer takes of the room; given back with the object. One thread at a time.
    class Share {
    public:
        Share(Count taken, std::size_t most) : taken_(std::move(taken)), most_(most) {}
        ~Share() { *taken_ -= own_; }
        Share(const Share&) = delete;
        Share& operator=(const Share&) = delete;

        /// Takes more; false if there is no room, and then it has taken nothing more.
        bool grow(std::size_t bytes);

    private:
        const Count taken_;
        const std::size_t most_;
        std::size_t own_ = 0;
    };

    std::shared_ptr<Share> share() const { return std::make_shared<Share>(taken_, most_); }

private:
    const std::size_t most_;
    const Count taken_ = std::make_shared<std::atomic<std::size_t>>(0);
};

/// What a browser is told when there is no room for an answer.
http::Reply noRoomForAnswer();

}  // namespace console
