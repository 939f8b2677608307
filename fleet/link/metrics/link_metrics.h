/// The table of a link's metrics.
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "fleet/bus/messages/values.h"
#include "metrics/counter.h"
#include "metrics/metric_table.h"
#include "metrics/process_figures.h"

namespace fleet {

/// What a link counts while it works. Counts begin at 0 with the process. Any thread.
struct LinkCounts {
    metrics::Counter handedOver;    ///< orders that went to the host
    metrics::Counter entered;       ///< orders whose end was recorded without the host's doing
    metrics::Counter reported;      ///< outcomes that were published, repeated ones among them
    metrics::Counter hellos;        ///< that were said
    metrics::Counter unheard;       ///< of those the ones without a reply
    metrics::Counter questions;     ///< that were answered
    metrics::Counter disconnected;  ///< how often the bus went away
};

/// What one look at a link sees, read once for all rows.
struct LinkScrape {
    const LinkCounts& counts;
    bool isConnected = false;
    bool isHostThere = false;
    bool isBlocked = false;
    Number taken = 0;
    std::uint64_t notSigned = 0;    ///< orders whose number the centre has not signed
    std::optional<Moment> replied;  ///< when the centre's latest reply came; absent before one
    metrics::ProcessFigures process;
};

/// In the order in which they are told. The process's own figures have names of the link's: the
/// node exporter, whose page they join, tells its own under the usual ones.
const std::vector<metrics::Metric<LinkScrape>>& linkMetricTable();

}  // namespace fleet
