/// Figures that a server keeps about itself. Any thread may read them.
#pragma once

#include <atomic>
#include <cstddef>

#include "metrics/counter.h"

namespace http {

struct ServerCounts {
    std::atomic<std::size_t> streams{0};  ///< event streams that are open
    metrics::Gauge connections;           ///< open now, event streams included
    metrics::Counter accepted;            ///< connections so far
    metrics::Counter refused;             ///< of those the ones that were told to go away
};

}  // namespace http
