// GET /v1/metrics

#include <string>

#include "host/api/metrics/metric_table.h"
#include "host/api/route.h"

namespace host {
namespace {

/// The other metrics are needed most when the journal is in trouble.
std::optional<Journal::Unfinished> readUnfinished(Journal& journal) {
    try {
        return journal.unfinished();
    } catch (const DatabaseError&) {
        return std::nullopt;
    }
}

}  // namespace

Endpoint getMetrics;

http::Answer getMetrics(Services& services, const Call&) {
    const Scrape scrape{services, readUnfinished(services.journal), services.journal.latestTime(),
                        metrics::readProcessFigures()};
    return http::Reply{200, metrics::pageOf(metricTable(), scrape),
                       std::string(metrics::Exposition::kContentType)};
}

}  // namespace host
