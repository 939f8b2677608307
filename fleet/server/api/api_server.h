/// The centre's interface on a TCP port, by HTTPS.
#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "fleet/https/front/tls_front.h"
#include "fleet/server/api/centre_api.h"
#include "fleet/server/api/console/centre_console.h"
#include "fleet/server/api/metrics/metrics_server.h"
#include "http/server.h"
#include "http/server_counts.h"

namespace fleet {

struct ListenPlace {
    std::string address;     ///< see listenOn(): "" is everywhere
    std::uint16_t port = 0;  ///< 0 is any that is free
};

/// Three threads and a pool of workers: the front does TLS, the HTTP server reads requests, and
/// the workers wait for the centre's thread.
class ApiServer {
public:
    /// Serves from now on, and the console to browsers if there is a page for it. The service
    /// outlives it. Throws KeysError, FrontError, UrlError, std::runtime_error and
    /// sqlite::DatabaseError.
    ApiServer(CentreService& service, const ListenPlace& place,
              std::vector<console::PageFile> page = {});
    /// Lets requests that are under way end, for some seconds.
    ~ApiServer();
    ApiServer(const ApiServer&) = delete;
    ApiServer& operator=(const ApiServer&) = delete;

    std::uint16_t port() const { return front_.port(); }
    const FrontCounts& frontCounts() const { return front_.counts(); }
    /// As long as the server.
    MetricsSources metricsSources() { return {service_, services_, counts_, front_.counts()}; }

private:
    CentreService& service_;
    ApiServices services_;
    CentreApi api_;
    const std::unique_ptr<CentreConsole> console_;  ///< null: only programs are served
    http::ServerCounts counts_;
    http::HttpServer server_;
    TlsFront front_;
    std::thread thread_;  ///< last: nothing may fail once it runs
};

}  // namespace fleet
