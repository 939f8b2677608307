/// The metrics that programs of all kinds have about their process, under the names that all of
/// them use.
#pragma once

#include <optional>
#include <vector>

#include "metrics/metric_table.h"
#include "metrics/process_figures.h"

namespace metrics {

/// Adds a sample, unless the value is not known.
inline void tellKnown(Exposition& out, const std::optional<double>& value) {
    if (value) out.sample(*value);
}

/// Adds their rows to a table. A scrape has the figures as its member `process`.
template <typename Scrape>
void addProcessMetrics(std::vector<Metric<Scrape>>& table) {
    using S = const Scrape&;
    const std::vector<Metric<Scrape>> rows = {
        {"process_cpu_seconds_total", MetricType::Counter, "",
         "Processor time that the process itself has spent.",
         [](S scrape, Exposition& out) { tellKnown(out, scrape.process.cpuSeconds); }},
        {"process_start_time_seconds", MetricType::Gauge, "",
         "When the process started, in seconds since the epoch.",
         [](S scrape, Exposition& out) { tellKnown(out, scrape.process.startSeconds); }},
        {"process_virtual_memory_bytes", MetricType::Gauge, "", "Size of the address space.",
         [](S scrape, Exposition& out) { tellKnown(out, scrape.process.virtualBytes); }},
        {"process_resident_memory_bytes", MetricType::Gauge, "", "Memory that is in use.",
         [](S scrape, Exposition& out) { tellKnown(out, scrape.process.residentBytes); }},
        {"process_open_fds", MetricType::Gauge, "", "File descriptors that are open.",
         [](S scrape, Exposition& out) { tellKnown(out, scrape.process.openDescriptors); }},
        {"process_max_fds", MetricType::Gauge, "", "File descriptors that may be open.",
         [](S scrape, Exposition& out) { tellKnown(out, scrape.process.mostDescriptors); }},
        {"process_threads", MetricType::Gauge, "", "Threads of the process.",
         [](S scrape, Exposition& out) { tellKnown(out, scrape.process.threads); }},
    };
    table.insert(table.end(), rows.begin(), rows.end());
}

}  // namespace metrics
