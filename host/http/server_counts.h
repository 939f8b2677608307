/// Figures that a server keeps about itself. Any thread may read them.
#pragma once

#include <atomic>
#include <cstddef>

#include "host/metrics/counter.h"

namespace host {

struct ServerCounts {
    std::atomic<std::size_t> streams{0};  ///< event streams that are open
    Gauge connections;                    ///< open now, event streams included
    Counter accepted;                     ///< connections so far
    Counter refused;                      ///< of those the ones that were told to go away
};

}  // namespace host
