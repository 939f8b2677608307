/// The centre's interface on a TCP port, by HTTPS.
#pragma once

#include <chrono>
#include <cstdint>
#include <string>
#include <thread>

#include "fleet/https/front/tls_front.h"
#include "fleet/server/api/centre_api.h"
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
    /// Serves from now on. The service outlives it. Throws KeysError, FrontError and
    /// sqlite::DatabaseError.
    ApiServer(CentreService& service, const ListenPlace& place);
    /// Lets requests that are under way end, for some seconds.
    ~ApiServer();
    ApiServer(const ApiServer&) = delete;
    ApiServer& operator=(const ApiServer&) = delete;

    std::uint16_t port() const { return front_.port(); }
    const FrontCounts& frontCounts() const { return front_.counts(); }

private:
    ApiServices services_;
    CentreApi api_;
    http::ServerCounts counts_;
    http::HttpServer server_;
    TlsFront front_;
    std::thread thread_;  ///< last: nothing may fail once it runs
};

}  // namespace fleet
