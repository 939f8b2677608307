/// The centre's metrics on a port of this machine.
#pragma once

#include <cstdint>
#include <string>
#include <thread>

#include "fleet/https/front/front_counts.h"
#include "fleet/server/api/api_services.h"
#include "fleet/server/store/stored_figures.h"
#include "http/handler.h"
#include "http/server.h"
#include "http/server_counts.h"
#include "routes/route_table.h"
#include "system/file_descriptor.h"

namespace fleet {

/// Where the figures come from. All of it outlives whoever has this.
struct MetricsSources {
    CentreService& service;
    ApiServices& services;
    const http::ServerCounts& server;
    const FrontCounts& front;
};

/// Makes the page that a monitoring system reads. Any thread.
class MetricsPageMaker {
public:
    explicit MetricsPageMaker(MetricsSources sources);

    /// What cannot be read is left out: the page is needed most when something is in trouble.
    std::string page();

private:
    const MetricsSources sources_;
    StoredFiguresReader stored_;
};

/// GET /v1/metrics by HTTP on the loopback address, and nothing else.
///
/// It is no part of the interface for operators. A monitoring system cannot sign, so it opens no
/// session; and an operator sees the hosts that a selector lets them see, while these figures are
/// those of all. They name no host, no operator and no order, so any user of this machine may read
/// them; whoever wants them elsewhere puts a proxy of their choice before them.
class MetricsServer {
public:
    /// Serves from now on; port 0 is any that is free. Throws FrontError if the port is taken.
    MetricsServer(const MetricsSources& sources, std::uint16_t port);
    ~MetricsServer();
    MetricsServer(const MetricsServer&) = delete;
    MetricsServer& operator=(const MetricsServer&) = delete;

    std::uint16_t port() const;

private:
    class Handler final : public http::Handler {
    public:
        explicit Handler(const MetricsSources& sources);
        std::variant<http::Answer, http::Job> handle(http::Request request) override;
        void prepareForEnd() override {}
        bool quiet() const override { return true; }

    private:
        MetricsPageMaker maker_;
        const routes::RouteTable<MetricsPageMaker> table_;
    };

    Handler handler_;
    const sys::FileDescriptor listener_;
    http::ServerCounts counts_;
    http::HttpServer server_;
    std::thread thread_;  ///< last: nothing may fail once it runs
};

}  // namespace fleet
