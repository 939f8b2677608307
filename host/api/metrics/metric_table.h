/// The table of metrics: everything that GET /v1/metrics tells.
#pragma once

#include <optional>
#include <vector>

#include "host/api/services.h"
#include "host/process/figures.h"
#include "metrics/exposition.h"

namespace host {

/// What one request for the metrics looks at, read once for all rows.
struct Scrape {
    const Services& services;
    std::optional<Journal::Unfinished> unfinished;  ///< absent: the journal cannot be read
    WallClock::time_point now;                      ///< as the journal sees it
    ProcessFigures process;
};

/// One metric. The values of its labels are fixed sets: none comes from a client.
struct Metric {
    const char* name;  ///< with "_total" for counters, and the unit, in its plural, before that
    metrics::MetricType type;
    const char* labels;  ///< their names, for the documentation, with ", " between them
    const char* help;    ///< one sentence
    /// Adds the metric's samples; none where the value is not known.
    void (*collect)(const Scrape& scrape, metrics::Exposition& out);
};

/// In the order in which they are told.
const std::vector<Metric>& metricTable();

}  // namespace host
