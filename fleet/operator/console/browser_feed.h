/// Events on their way from a thread to a browser.
#pragma once

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>

#include "http/event_source.h"

namespace fleet {

/// A thread puts events in, and the browser's stream takes them out. A bounded number of bytes
/// waits for the browser; beyond that the thread waits as well. Any thread.
class BrowserFeed {
public:
    /// Adds a piece of the stream, which may end anywhere. False if no more is wanted: the browser
    /// has gone, or the stream has lasted so long that the page is to ask anew.
    bool keep(std::string_view piece);
    /// Waits. False, and at once, if no more is wanted.
    bool pause(std::chrono::milliseconds time);
    /// Nothing more comes.
    void end();

    /// Has keep() and pause() return soon.
    void cancel();

    // See http::EventSource.
    void start(const std::function<void()>& wake);
    std::string take();
    bool empty() const;
    bool over() const;

private:
    using Clock = std::chrono::steady_clock;

    bool isWanted() const;
    void wakeReader(std::unique_lock<std::mutex>& lock);

    const Clock::time_point begun_ = Clock::now();
    mutable std::mutex mutex_;
    std::condition_variable changed_;
    std::function<void()> wake_;
    std::string held_;
    std::size_t whole_ = 0;  ///< bytes of held_ that are whole events
    bool isOver_ = false;
    bool isCancelled_ = false;
};

/// What a server sends from: the feed, which begins behind `position`. `onGone` is called when the
/// browser has gone; it returns at once.
std::unique_ptr<http::EventSource> sourceOf(std::shared_ptr<BrowserFeed> feed, std::string position,
                                            std::function<void()> onGone);

}  // namespace fleet
