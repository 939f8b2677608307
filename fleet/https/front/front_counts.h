/// Figures that a front keeps about itself. Any thread may read them.
#pragma once

#include "metrics/counter.h"

namespace fleet {

struct FrontCounts {
    metrics::Gauge connections;         ///< open now, in a handshake or behind it
    metrics::Counter accepted;          ///< connections so far
    metrics::Counter failedHandshakes;  ///< of those the ones that never spoke TLS to the end
    metrics::Counter turnedAway;        ///< closed at once: too many from one origin
};

}  // namespace fleet
