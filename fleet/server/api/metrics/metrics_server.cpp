#include "fleet/server/api/metrics/metrics_server.h"

#include <exception>
#include <optional>
#include <utility>
#include <vector>

#include "fleet/https/front/tcp_listener.h"
#include "fleet/log/log.h"
#include "fleet/server/api/metrics/centre_metrics.h"
#include "routes/call.h"

namespace fleet {
namespace {

constexpr const char* kLoopback = "127.0.0.1";
constexpr std::chrono::seconds kGraceOfScrapes{2};

/// What `read` returns; what cannot be read is said, and is not there.
template <typename Read>
auto readOrSay(const char* what, Read read) -> decltype(read()) {
    try {
        return read();
    } catch (const std::exception& error) {
        say(Priority::Warning, std::string("metrics: ") + what + ": " + error.what());
        return {};
    }
}

http::Answer getCentreMetrics(MetricsPageMaker& maker, const routes::Call&) {
    return http::Reply{200, maker.page(), std::string(metrics::Exposition::kContentType)};
}

std::vector<routes::Route<MetricsPageMaker>> scrapeRoutes() {
    return {{"GET",
             "/v1/metrics",
             "What the centre counts, for a monitoring system.",
             http::Access::Read,
             routes::Runs::OnWorker,
             getCentreMetrics,
             {{200, "the figures, in Prometheus' text format 0.0.4", nullptr}}}};
}

http::Door scrapeDoor() {
    return {[](int) { return http::Peer{0, 0, 0, http::Access::Read, "this machine"}; }, ""};
}

/// One monitoring system, or two. The figures are read on few threads, so that nobody who asks
/// without end takes the processors from the centre.
http::ServerLimits scrapeLimits() {
    http::ServerLimits limits;
    limits.connections = 16;
    limits.readers = 16;
    limits.workers = 1;
    limits.waitingRequests = 16;
    return limits;
}

}  // namespace

MetricsPageMaker::MetricsPageMaker(MetricsSources sources)
    : sources_(sources), stored_(sources.services.directory.orders()) {}

std::string MetricsPageMaker::page() {
    ApiServices& services = sources_.services;
    const Moment now = wallClock();
    CentreScrape scrape{sources_.service.centre(),
                        services.counts,
                        sources_.server,
                        sources_.front,
                        services.sessions.count(now),
                        now,
                        {},
                        {},
                        {},
                        {}};
    scrape.members = readOrSay("the hosts", [&] { return services.members(); });
    scrape.stored = readOrSay("the orders' database",
                              [&] { return std::optional<StoredFigures>(stored_.read(now)); });
    scrape.endings = readOrSay("the certificates", [&] {
        return services.withTrust(
            [&](sqlite::Database& trust) { return allEndingsOf(services.directory, trust, now); });
    });
    scrape.process = metrics::readProcessFigures();
    return metrics::pageOf(centreMetricTable(), scrape);
}

MetricsServer::Handler::Handler(const MetricsSources& sources)
    : maker_(sources), table_(scrapeRoutes(), "nobody changes anything here") {}

std::variant<http::Answer, http::Job> MetricsServer::Handler::handle(http::Request request) {
    return table_.dispatch(std::move(request),
                           [this](const routes::Route<MetricsPageMaker>& route,
                                  routes::Call& call) { return route.endpoint(maker_, call); });
}

MetricsServer::MetricsServer(const MetricsSources& sources, std::uint16_t port)
    : handler_(sources),
      listener_(listenOn(kLoopback, port)),
      server_(listener_.get(), scrapeDoor(), handler_, counts_, scrapeLimits()),
      thread_([this] { server_.run(); }) {}

MetricsServer::~MetricsServer() {
    server_.end(kGraceOfScrapes);
    thread_.join();
}

std::uint16_t MetricsServer::port() const {
    return portOf(listener_);
}

}  // namespace fleet
