/// The table of metrics: everything that GET /v1/metrics tells.
#pragma once

#include <optional>
#include <vector>

#include "host/api/services.h"
#include "metrics/metric_table.h"
#include "metrics/process_figures.h"

namespace host {

/// What one request for the metrics looks at, read once for all rows.
struct Scrape {
    const Services& services;
    std::optional<Journal::Unfinished> unfinished;  ///< absent: the journal cannot be read
    WallClock::time_point now;                      ///< as the journal sees it
    metrics::ProcessFigures process;
};

using Metric = metrics::Metric<Scrape>;

/// In the order in which they are told.
const std::vector<Metric>& metricTable();

}  // namespace host
