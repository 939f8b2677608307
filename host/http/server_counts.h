/// Figures that a server keeps about itself. Any thread may read them.
#pragma once

#include <atomic>
#include <cstddef>

namespace host {

struct ServerCounts {
    std::atomic<std::size_t> streams{0};  ///< event streams that are open
};

}  // namespace host
