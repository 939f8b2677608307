#include "fleet/server/api/metrics/centre_metrics.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <map>
#include <utility>

#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/rollouts/rollout_view.h"
#include "metrics/process_metrics.h"

namespace fleet {
namespace {

using metrics::Exposition;

double figureOf(const metrics::Counter& counter) {
    return static_cast<double>(counter.value());
}

double yesOrNo(bool is) {
    return is ? 1 : 0;
}

/// All hosts of the fleet, by what operators see of them. Hosts that were taken out of it have left
/// a row behind, and those that have never said hello may have none.
void tellHosts(const CentreScrape& scrape, Exposition& out) {
    if (!scrape.members || !scrape.stored) return;
    std::map<std::string, double> counts = {{"here", 0}, {"away", 0}, {"stopped", 0}};
    double known = 0;
    for (const StoredFigures::SeenHost& seen : scrape.stored->hosts) {
        if (scrape.members->count(seen.host) == 0) continue;
        ++known;
        ++counts[hostState(seen.heard, seen.isStopped ? "stopped" : "", scrape.now)];
    }
    counts["unknown"] += static_cast<double>(scrape.members->size()) - known;
    for (const auto& [state, count] : counts)
        out.sample({{"state", state}}, count);
}

void tellHeldHosts(const CentreScrape& scrape, Exposition& out) {
    if (!scrape.members || !scrape.stored) return;
    const auto& hosts = scrape.stored->hosts;
    out.sample(static_cast<double>(std::count_if(hosts.begin(), hosts.end(), [&](const auto& seen) {
        return seen.isHeld && scrape.members->count(seen.host) != 0;
    })));
}

void tellOpenOrders(const CentreScrape& scrape, Exposition& out) {
    if (!scrape.stored) return;
    const StoredFigures& stored = *scrape.stored;
    out.sample({{"state", "waiting"}}, static_cast<double>(stored.waiting));
    const std::uint64_t behind = std::min(stored.waiting, stored.open);
    out.sample({{"state", "published"}}, static_cast<double>(stored.open - behind));
}

void tellOutcomes(const CentreScrape& scrape, Exposition& out) {
    scrape.centre.counts().eachOutcome(
        [&out](std::string_view command, std::string_view state, std::uint64_t count) {
            out.sample({{"command", command}, {"state", state}}, static_cast<double>(count));
        });
}

template <typename Key>
double countOf(const std::map<Key, std::uint64_t>& counts, Key key) {
    const auto found = counts.find(key);
    return found == counts.end() ? 0 : static_cast<double>(found->second);
}

void tellRollouts(const CentreScrape& scrape, Exposition& out) {
    if (!scrape.stored) return;
    for (const RolloutState state : {RolloutState::Running, RolloutState::Paused,
                                     RolloutState::Aborted, RolloutState::Finished}) {
        out.sample({{"state", nameOf(state)}}, countOf(scrape.stored->rollouts, state));
    }
}

void tellPaused(const CentreScrape& scrape, Exposition& out) {
    if (!scrape.stored) return;
    for (const PauseCause cause :
         {PauseCause::Operator, PauseCause::Failures, PauseCause::Expiry, PauseCause::Restore}) {
        out.sample({{"cause", nameOf(cause)}}, countOf(scrape.stored->paused, cause));
    }
}

void tellPublishes(const CentreScrape& scrape, Exposition& out) {
    const CentreCounts& counts = scrape.centre.counts();
    out.sample({{"answer", "stored"}}, figureOf(counts.published));
    out.sample({{"answer", "there"}}, figureOf(counts.foundThere));
    out.sample({{"answer", "none"}}, figureOf(counts.unanswered));
}

/// The next end of each kind.
void tellEndings(const CentreScrape& scrape, Exposition& out) {
    constexpr std::array<std::pair<Ending::Of, const char*>, 4> kKinds = {
        {{Ending::Of::Centre, "centre"},
         {Ending::Of::Server, "server"},
         {Ending::Of::Authority, "authority"},
         {Ending::Of::Operator, "operator"}}};
    for (const auto& [kind, name] : kKinds) {
        const auto first =
            std::find_if(scrape.endings.begin(), scrape.endings.end(),
                         [kind = kind](const Ending& one) { return one.of == kind; });
        if (first == scrape.endings.end()) continue;
        out.sample({{"of", name}}, std::chrono::duration<double>(first->until).count());
    }
}

void tellLeaseAge(const CentreScrape& scrape, Exposition& out) {
    const auto age = scrape.centre.leaseAge();
    if (age) out.sample(std::chrono::duration<double>(*age).count());
}

std::vector<metrics::Metric<CentreScrape>> makeTable() {
    constexpr auto kCounter = metrics::MetricType::Counter;
    constexpr auto kGauge = metrics::MetricType::Gauge;
    constexpr auto kHistogram = metrics::MetricType::Histogram;
    using S = const CentreScrape&;
    using Out = Exposition&;
    // clang-format off
    std::vector<metrics::Metric<CentreScrape>> table = {
        {"zavfleetd_working", kGauge, "",
         "Whether this centre has the lease and works: 1 or 0.",
         [](S scrape, Out out) { out.sample(yesOrNo(scrape.centre.isWorking())); }},
        {"zavfleetd_lease_age_seconds", kGauge, "",
         "How long ago the lease was claimed or renewed; absent without it.", tellLeaseAge},
        {"zavfleetd_lease_renewals_total", kCounter, "",
         "Renewals of the lease that the bus has acknowledged.",
         [](S scrape, Out out) { out.sample(figureOf(scrape.centre.counts().renewals)); }},
        {"zavfleetd_lease_renewals_repeated_total", kCounter, "",
         "Tries to renew the lease of which the bus said nothing.",
         [](S scrape, Out out) { out.sample(figureOf(scrape.centre.counts().repeatedRenewals)); }},
        {"zavfleetd_bus_connected", kGauge, "",
         "Whether there is a connection to the bus: 1 or 0.",
         [](S scrape, Out out) { out.sample(yesOrNo(scrape.centre.isConnected())); }},
        {"zavfleetd_hosts", kGauge, "state",
         "Hosts of the fleet.", tellHosts},
        {"zavfleetd_hosts_held", kGauge, "",
         "Hosts for which nothing is published, because the database or the bus is not what it was.",
         tellHeldHosts},
        {"zavfleetd_hellos_total", kCounter, "",
         "Hellos of hosts that were answered.",
         [](S scrape, Out out) { out.sample(figureOf(scrape.centre.counts().hellos)); }},
        {"zavfleetd_hellos_unheard_total", kCounter, "",
         "Hellos that came too often, or while too many waited.",
         [](S scrape, Out out) { out.sample(figureOf(scrape.centre.counts().unheard)); }},
        {"zavfleetd_alarms_total", kCounter, "",
         "Alarms: hosts that two machines claim to be, that tell two outcomes, or whose numbers make no sense.",
         [](S scrape, Out out) { out.sample(figureOf(scrape.centre.counts().alarms)); }},
        {"zavfleetd_orders_open", kGauge, "state",
         "Orders that have a number and no outcome: waiting for the bus, or published.",
         tellOpenOrders},
        {"zavfleetd_orders_unconfirmed", kGauge, "",
         "Orders of roll-outs that are out of date and whose end no host has told.",
         [](S scrape, Out out) {
             if (scrape.stored) out.sample(static_cast<double>(scrape.stored->unconfirmed));
         }},
        {"zavfleetd_outcomes_total", kCounter, "command, state",
         "Outcomes of orders that were kept; an unknown one that a real one replaces counts as both.",
         tellOutcomes},
        {"zavfleetd_publishes_total", kCounter, "answer",
         "Tries to publish an order: stored, there already, or without an answer.", tellPublishes},
        {"zavfleetd_rollouts", kGauge, "state",
         "Roll-outs.", tellRollouts},
        {"zavfleetd_rollouts_paused", kGauge, "cause",
         "Roll-outs that are paused.", tellPaused},
        {"zavfleetd_commit_duration_seconds", kHistogram, "",
         "How long transactions of the orders' database took until they were durable.",
         [](S scrape, Out out) { out.sample(scrape.centre.counts().commits.snapshot()); }},
        {"zavfleetd_commit_failures_total", kCounter, "",
         "Transactions of the orders' database that could not be written.",
         [](S scrape, Out out) { out.sample(figureOf(scrape.centre.counts().failedCommits)); }},
        {"zavfleetd_requests_total", kCounter, "status",
         "Requests that the interface has answered.",
         [](S scrape, Out out) {
             scrape.api.answers.each([&out](std::string_view status, const metrics::Counter& count) {
                 out.sample({{"status", status}}, figureOf(count));
             });
         }},
        {"zavfleetd_sessions", kGauge, "",
         "Sessions of operators and hosts that are open.",
         [](S scrape, Out out) { out.sample(static_cast<double>(scrape.sessions)); }},
        {"zavfleetd_sessions_opened_total", kCounter, "",
         "Sessions that were opened.",
         [](S scrape, Out out) { out.sample(figureOf(scrape.api.openedSessions)); }},
        {"zavfleetd_file_pieces_served_total", kCounter, "",
         "Pieces of files that hosts have fetched.",
         [](S scrape, Out out) { out.sample(figureOf(scrape.api.servedPieces)); }},
        {"zavfleetd_file_served_bytes_total", kCounter, "",
         "Bytes of files that hosts have fetched.",
         [](S scrape, Out out) { out.sample(figureOf(scrape.api.servedBytes)); }},
        {"zavfleetd_connections", kGauge, "",
         "Connections to the interface that are open.",
         [](S scrape, Out out) { out.sample(static_cast<double>(scrape.front.connections.value())); }},
        {"zavfleetd_connections_accepted_total", kCounter, "",
         "Connections that clients opened.",
         [](S scrape, Out out) { out.sample(figureOf(scrape.front.accepted)); }},
        {"zavfleetd_connections_refused_total", kCounter, "",
         "Connections that were refused, because too many were open.",
         [](S scrape, Out out) {
             out.sample(figureOf(scrape.front.turnedAway) + figureOf(scrape.server.refused));
         }},
        {"zavfleetd_handshake_failures_total", kCounter, "",
         "Connections that never spoke TLS to the end.",
         [](S scrape, Out out) { out.sample(figureOf(scrape.front.failedHandshakes)); }},
        {"zavfleetd_event_streams", kGauge, "",
         "Streams of events that are open.",
         [](S scrape, Out out) { out.sample(static_cast<double>(scrape.server.streams.load())); }},
        {"zavfleetd_certificate_end_time_seconds", kGauge, "of",
         "When the certificates end, in seconds since the epoch; the next one of operators.",
         tellEndings},
        {"zavfleetd_build_info", kGauge, "version",
         "1; the label tells the version.",
         [](S, Out out) { out.sample({{"version", ZAV_VERSION}}, 1); }},
    };
    // clang-format on
    addProcessMetrics(table);
    return table;
}

}  // namespace

const std::vector<metrics::Metric<CentreScrape>>& centreMetricTable() {
    static const std::vector<metrics::Metric<CentreScrape>> table = makeTable();
    return table;
}

}  // namespace fleet
