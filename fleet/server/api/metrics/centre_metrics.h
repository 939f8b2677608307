/// The table of the centre's metrics: everything that its GET /v1/metrics tells.
#pragma once

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "fleet/https/front/front_counts.h"
#include "fleet/server/api/metrics/api_counts.h"
#include "fleet/server/keys/trust/endings.h"
#include "fleet/server/keys/trust/members.h"
#include "fleet/server/program/centre_program.h"
#include "fleet/server/store/stored_figures.h"
#include "http/server_counts.h"
#include "metrics/metric_table.h"
#include "metrics/process_figures.h"

namespace fleet {

/// What one request for the metrics looks at, read once for all rows.
struct CentreScrape {
    const CentreProgram& centre;
    const ApiCounts& api;
    const http::ServerCounts& server;
    const FrontCounts& front;
    std::size_t sessions = 0;
    Moment now{};
    // Absent or empty: the database cannot be read.
    std::shared_ptr<const Members> members;
    std::optional<StoredFigures> stored;
    std::vector<Ending> endings;  ///< all of them
    metrics::ProcessFigures process;
};

/// In the order in which they are told. The values of their labels are fixed sets: neither a host
/// nor an operator can add series.
const std::vector<metrics::Metric<CentreScrape>>& centreMetricTable();

}  // namespace fleet
