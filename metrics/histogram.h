/// How long something takes, as a distribution.
#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>
#include <deque>
#include <vector>

namespace metrics {

/// Counts durations in buckets. Any thread; observing is two atomic additions.
class Histogram {
public:
    using Duration = std::chrono::nanoseconds;

    /// The upper bounds of the buckets, each larger than the one before; what is longer than the
    /// last one is counted, too.
    explicit Histogram(std::vector<Duration> bounds);
    Histogram(const Histogram&) = delete;
    Histogram& operator=(const Histogram&) = delete;

    /// One more that took so long. A negative time, which a clock that was set back makes, is 0.
    void observe(Duration took) noexcept;

    struct Bucket {
        Duration bound;
        std::uint64_t count;  ///< of those that took at most so long, shorter ones included
    };
    struct Snapshot {
        std::vector<Bucket> buckets;
        std::uint64_t count = 0;  ///< of all
        Duration sum{};
    };
    /// While others observe, the sum may be behind the count; the counts agree with each other.
    Snapshot snapshot() const;

private:
    const std::vector<Duration> bounds_;
    std::deque<std::atomic<std::uint64_t>> counts_;  ///< of each bucket alone, and of what is left
    std::atomic<std::uint64_t> sum_{0};              ///< nanoseconds
};

}  // namespace metrics
