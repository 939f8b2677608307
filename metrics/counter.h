/// Numbers that are kept while the host works, for whoever watches it.
#pragma once

#include <atomic>
#include <cstdint>

namespace metrics {

/// Counts up from 0. Any thread; counting is one atomic addition.
class Counter {
public:
    void add(std::uint64_t more = 1) noexcept { value_.fetch_add(more, std::memory_order_relaxed); }
    std::uint64_t value() const noexcept { return value_.load(std::memory_order_relaxed); }

private:
    std::atomic<std::uint64_t> value_{0};
};

/// A number that goes up and down, 0 at first. Any thread.
class Gauge {
public:
    void set(std::uint64_t value) noexcept { value_.store(value, std::memory_order_relaxed); }
    std::uint64_t value() const noexcept { return value_.load(std::memory_order_relaxed); }

private:
    std::atomic<std::uint64_t> value_{0};
};

}  // namespace metrics
