#include "host/api/metrics/metric_table.h"

#include <algorithm>
#include <chrono>
#include <string>

#include "host/home/inventory.h"
#include "host/process/children/process_table.h"
#include "host/process/version.h"
#include "metrics/process_metrics.h"

namespace host {
namespace {

template <typename Time>
double secondsOf(Time time) {
    return std::max(0.0, std::chrono::duration<double>(time).count());
}

double figure(const metrics::Counter& counter) {
    return static_cast<double>(counter.value());
}

void tellTasks(const Scrape& scrape, metrics::Exposition& out) {
    scrape.services.tasks.counts().eachEnd(
        [&out](std::string_view command, std::string_view outcome, std::uint64_t count) {
            out.sample({{"command", command}, {"outcome", outcome}}, static_cast<double>(count));
        });
}

void tellDurations(const Scrape& scrape, metrics::Exposition& out) {
    scrape.services.tasks.counts().durations().each(
        [&out](std::string_view command, const metrics::Histogram& durations) {
            out.sample({{"command", command}}, durations.snapshot());
        });
}

void tellQueueAge(const Scrape& scrape, metrics::Exposition& out) {
    if (!scrape.unfinished) return;
    const auto oldest = scrape.unfinished->oldestQueued;
    out.sample(oldest ? secondsOf(scrape.now - *oldest) : 0);
}

void tellRefusals(const Scrape& scrape, metrics::Exposition& out) {
    scrape.services.refusals.each([&out](std::string_view guard, const metrics::Counter& counter) {
        out.sample({{"guard", guard}}, figure(counter));
    });
}

/// The connections of both sockets. `rpc` is a figure of the one for file transfers.
template <typename Rpc>
void tellSockets(const Scrape& scrape, metrics::Exposition& out, double http,
                 Rpc ncs::Counts::*rpc) {
    out.sample({{"socket", "http"}}, http);
    if (!scrape.services.transferServer) return;
    out.sample({{"socket", "rpc"}}, static_cast<double>(scrape.services.transferServer().*rpc));
}

void tellInventoryAge(const Scrape&, metrics::Exposition& out) {
    const auto last = lastInventory();
    if (last) out.sample(secondsOf(std::chrono::steady_clock::now() - last->read));
}

void tellInventorySize(const Scrape&, metrics::Exposition& out) {
    const auto last = lastInventory();
    if (last) out.sample(static_cast<double>(last->products));
}

void tellBuild(const Scrape&, metrics::Exposition& out) {
    const std::string width = std::to_string(sizeof(void*) * 8);
    out.sample({{"version", kVersion}, {"width", width}}, 1);
}

std::vector<Metric> makeTable() {
    constexpr auto kCounter = metrics::MetricType::Counter;
    constexpr auto kGauge = metrics::MetricType::Gauge;
    constexpr auto kHistogram = metrics::MetricType::Histogram;
    using S = const Scrape&;
    using Out = metrics::Exposition&;
    // clang-format off
    std::vector<Metric> table = {
        {"zavhost_tasks_total", kCounter, "command, outcome",
         "Tasks that ended, by command and the state in which they ended.", tellTasks},
        {"zavhost_task_duration_seconds", kHistogram, "command",
         "How long tasks ran, from their start to their end.", tellDurations},
        {"zavhost_queue_length", kGauge, "",
         "Tasks that were accepted and have not begun.",
         [](S scrape, Out out) {
             if (scrape.unfinished) out.sample(static_cast<double>(scrape.unfinished->queued));
         }},
        {"zavhost_queue_head_age_seconds", kGauge, "",
         "How long the oldest task that has not begun has been waiting; 0 if none waits.",
         tellQueueAge},
        {"zavhost_tasks_running", kGauge, "",
         "Tasks that have begun and not ended.",
         [](S scrape, Out out) {
             if (scrape.unfinished) out.sample(static_cast<double>(scrape.unfinished->running));
         }},
        {"zavhost_guard_refusals_total", kCounter, "guard",
         "Requests and transfers that a guard refused.", tellRefusals},
        {"zavhost_transfers_total", kCounter, "",
         "Files that clients began to send, those that were refused among them.",
         [](S scrape, Out out) { out.sample(figure(scrape.services.transfers.counts().begun)); }},
        {"zavhost_transfer_failures_total", kCounter, "",
         "Batches of files that were refused or could not be stored.",
         [](S scrape, Out out) { out.sample(figure(scrape.services.transfers.counts().failed)); }},
        {"zavhost_transfer_received_bytes_total", kCounter, "",
         "Bytes of files that were received and stored.",
         [](S scrape, Out out) { out.sample(figure(scrape.services.transfers.counts().bytes)); }},
        {"zavhost_journal_commit_duration_seconds", kHistogram, "",
         "How long transactions of the journal took until they were durable.",
         [](S scrape, Out out) { out.sample(scrape.services.journal.commitTimes().snapshot()); }},
        {"zavhost_journal_commit_failures_total", kCounter, "",
         "Transactions of the journal that could not be written, each new try counted.",
         [](S scrape, Out out) { out.sample(figure(scrape.services.journal.failedCommits())); }},
        {"zavhost_connections", kGauge, "socket",
         "Connections that are open.",
         [](S scrape, Out out) {
             const auto open = static_cast<double>(scrape.services.counts.connections.value());
             tellSockets(scrape, out, open, &ncs::Counts::connections);
         }},
        {"zavhost_connections_accepted_total", kCounter, "socket",
         "Connections that clients opened.",
         [](S scrape, Out out) {
             const double accepted = figure(scrape.services.counts.accepted);
             tellSockets(scrape, out, accepted, &ncs::Counts::accepted);
         }},
        {"zavhost_connections_refused_total", kCounter, "socket",
         "Connections that were refused, because of the client's user or because too many were open.",
         [](S scrape, Out out) {
             const double refused = figure(scrape.services.counts.refused);
             tellSockets(scrape, out, refused, &ncs::Counts::refused);
         }},
        {"zavhost_subscriptions", kGauge, "",
         "Event streams that are open.",
         [](S scrape, Out out) {
             out.sample(static_cast<double>(scrape.services.counts.streams.load()));
         }},
        {"zavhost_child_processes", kGauge, "",
         "Child processes that live, adopted ones among them.",
         [](S, Out out) { out.sample(static_cast<double>(countLivingChildren())); }},
        {"zavhost_inventory_age_seconds", kGauge, "",
         "How long ago the host last read the home's inventory; absent until it has.",
         tellInventoryAge},
        {"zavhost_inventory_products", kGauge, "",
         "Entries that the inventory had then, one for each platform of a product.",
         tellInventorySize},
        {"zavhost_guarded", kGauge, "",
         "Whether the guards are on: 1 or 0.",
         [](S scrape, Out out) { out.sample(scrape.services.guarded ? 1 : 0); }},
        {"zavhost_build_info", kGauge, "version, width",
         "1; the labels tell the version and the width of the process in bits.", tellBuild},
        // As process_start_time_seconds, which gets lost among those of other programs.
        {"zavhost_start_time_seconds", kGauge, "",
         "When the host started, in seconds since the epoch.",
         [](S scrape, Out out) { metrics::tellKnown(out, scrape.process.startSeconds); }},
    };
    // clang-format on
    addProcessMetrics(table);
    return table;
}

}  // namespace

const std::vector<Metric>& metricTable() {
    static const std::vector<Metric> table = makeTable();
    return table;
}

}  // namespace host
