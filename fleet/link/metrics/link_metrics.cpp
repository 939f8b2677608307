#include "fleet/link/metrics/link_metrics.h"

#include <chrono>

#include "metrics/process_metrics.h"

namespace fleet {
namespace {

using metrics::Exposition;

/// A row whose figure is one of the counters.
template <metrics::Counter LinkCounts::*kCounter>
void tellCounter(const LinkScrape& scrape, Exposition& out) {
    out.sample(static_cast<double>((scrape.counts.*kCounter).value()));
}

/// A row that says yes or no.
template <bool LinkScrape::*kFlag>
void tellFlag(const LinkScrape& scrape, Exposition& out) {
    out.sample(scrape.*kFlag ? 1 : 0);
}

void tellReplied(const LinkScrape& scrape, Exposition& out) {
    if (scrape.replied) out.sample(std::chrono::duration<double>(*scrape.replied).count());
}

std::vector<metrics::Metric<LinkScrape>> linkTable() {
    constexpr auto kCounter = metrics::MetricType::Counter;
    constexpr auto kGauge = metrics::MetricType::Gauge;
    using S = const LinkScrape&;
    using Out = Exposition&;
    // clang-format off
    return {
        {"zavlink_bus_connected", kGauge, "",
         "Whether there is a connection to the bus: 1 or 0.", tellFlag<&LinkScrape::isConnected>},
        {"zavlink_bus_disconnections_total", kCounter, "",
         "How often the bus went away.", tellCounter<&LinkCounts::disconnected>},
        {"zavlink_host_answers", kGauge, "",
         "Whether the host on this machine answers: 1 or 0.", tellFlag<&LinkScrape::isHostThere>},
        {"zavlink_blocked", kGauge, "",
         "Whether something is in the way of the next order: 1 or 0.", tellFlag<&LinkScrape::isBlocked>},
        {"zavlink_taken", kGauge, "",
         "The number of the last order that the host has a record of.",
         [](S scrape, Out out) { out.sample(static_cast<double>(scrape.taken)); }},
        {"zavlink_orders_handed_over_total", kCounter, "",
         "Tries to hand an order over to the host.", tellCounter<&LinkCounts::handedOver>},
        {"zavlink_orders_entered_total", kCounter, "",
         "Tries to record an order as refused, expired or cancelled.", tellCounter<&LinkCounts::entered>},
        {"zavlink_outcomes_total", kCounter, "",
         "Outcomes that were published, repeated ones among them.", tellCounter<&LinkCounts::reported>},
        {"zavlink_hellos_total", kCounter, "",
         "Hellos that were said to the centre.", tellCounter<&LinkCounts::hellos>},
        {"zavlink_hellos_unheard_total", kCounter, "",
         "Hellos that brought no reply.", tellCounter<&LinkCounts::unheard>},
        {"zavlink_reply_time_seconds", kGauge, "",
         "When the centre last replied, in seconds since the epoch; absent before it has.", tellReplied},
        {"zavlink_numbers_unsigned_total", kCounter, "",
         "Orders on the bus whose number the centre has not signed.", 
         [](S scrape, Out out) { out.sample(static_cast<double>(scrape.notSigned)); }},
        {"zavlink_questions_total", kCounter, "",
         "Questions of operators that were answered.", tellCounter<&LinkCounts::questions>},
        {"zavlink_build_info", kGauge, "version",
         "1; the label tells the version.",
         [](S, Out out) { out.sample({{"version", ZAV_VERSION}}, 1); }},
        {"zavlink_cpu_seconds_total", kCounter, "",
         "Processor time that the link itself has spent.",
         [](S scrape, Out out) { tellKnown(out, scrape.process.cpuSeconds); }},
        {"zavlink_resident_memory_bytes", kGauge, "",
         "Memory that the link uses.",
         [](S scrape, Out out) { tellKnown(out, scrape.process.residentBytes); }},
        {"zavlink_start_time_seconds", kGauge, "",
         "When the link started, in seconds since the epoch.",
         [](S scrape, Out out) { tellKnown(out, scrape.process.startSeconds); }},
    };
    // clang-format on
}

}  // namespace

const std::vector<metrics::Metric<LinkScrape>>& linkMetricTable() {
    static const std::vector<metrics::Metric<LinkScrape>> table = linkTable();
    return table;
}

}  // namespace fleet
