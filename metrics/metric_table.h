/// A program's metrics as rows of data.
#pragma once

#include <string>
#include <vector>

#include "metrics/exposition.h"

namespace metrics {

/// One metric of a program that reads `Scrape` once for all of its rows. The values of its labels
/// are fixed sets: none comes from a client.
template <typename Scrape>
struct Metric {
    const char* name;  ///< with "_total" for counters, and the unit, in its plural, before that
    MetricType type;
    const char* labels;  ///< their names, for the documentation, with ", " between them
    const char* help;    ///< one sentence
    /// Adds the metric's samples; none where the value is not known.
    void (*collect)(const Scrape& scrape, Exposition& out);
};

/// What a scrape tells, row by row.
template <typename Scrape>
std::string pageOf(const std::vector<Metric<Scrape>>& table, const Scrape& scrape) {
    Exposition out;
    for (const Metric<Scrape>& metric : table) {
        out.metric(metric.name, metric.type, metric.help);
        metric.collect(scrape, out);
    }
    return out.text();
}

}  // namespace metrics
