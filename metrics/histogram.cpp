#include "metrics/histogram.h"

#include <algorithm>
#include <cstddef>
#include <utility>

namespace metrics {

Histogram::Histogram(std::vector<Duration> bounds)
    : bounds_(std::move(bounds)), counts_(bounds_.size() + 1) {}

void Histogram::observe(Duration took) noexcept {
    const Duration time = std::max(took, Duration::zero());
    const auto bucket = std::lower_bound(bounds_.begin(), bounds_.end(), time) - bounds_.begin();
    counts_[static_cast<std::size_t>(bucket)].fetch_add(1, std::memory_order_relaxed);
    sum_.fetch_add(static_cast<std::uint64_t>(time.count()), std::memory_order_relaxed);
}

Histogram::Snapshot Histogram::snapshot() const {
    Snapshot taken;
    for (std::size_t i = 0; i < bounds_.size(); ++i) {
        taken.count += counts_[i].load(std::memory_order_relaxed);
        taken.buckets.push_back({bounds_[i], taken.count});
    }
    taken.count += counts_.back().load(std::memory_order_relaxed);
    taken.sum = Duration(static_cast<Duration::rep>(sum_.load(std::memory_order_relaxed)));
    return taken;
}

}  // namespace metrics
