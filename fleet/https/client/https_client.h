/// A client of one HTTPS server.
#pragma once

#include <chrono>
#include <cstddef>
#include <memory>
#include <string>

#include "fleet/https/client/https_error.h"
#include "fleet/https/client/server_trust.h"
#include "fleet/https/client/server_url.h"

namespace fleet {

struct HttpsRequest {
    std::string method = "GET";
    std::string target;  ///< the path and what follows it, with what is no letter in %XX
    std::string body = {};
    std::string contentType = "application/json";  ///< of the body, if there is one
    std::string session = {};  ///< for "Authorization: Bearer"; "" sends no such field
    std::string range = {};    ///< for "Range", such as "bytes=0-99"; likewise
};

struct HttpsAnswer {
    unsigned status = 0;
    std::string body;
};

/// Sends one request after the other, on one connection as long as the server keeps that open. One
/// thread at a time. What waits, waits until a deadline; only the look-up of a name takes as long
/// as the system lets it.
class HttpsClient {
public:
    using Deadline = std::chrono::steady_clock::time_point;
    /// An answer with a longer body is refused.
    static constexpr std::size_t kMostBytes = 16UL * 1024 * 1024;

    /// Connects with the first request. Throws HttpsError(NotTrusted) if the trust makes no sense.
    HttpsClient(ServerUrl url, ServerTrust trust);
    ~HttpsClient();
    HttpsClient(const HttpsClient&) = delete;
    HttpsClient& operator=(const HttpsClient&) = delete;

    /// The answer, whatever its status. Throws HttpsError. A GET is sent again, once, when it went
    /// out on a connection that the server had closed meanwhile; nothing else is sent twice.
    HttpsAnswer ask(const HttpsRequest& request, Deadline deadline);

    /// The certificate of the authority that vouched for the server at the latest connection, PEM;
    /// "" before there was one. Who knew only its fingerprint keeps it.
    const std::string& authority() const;

private:
    class Connection;

    const ServerUrl url_;
    std::unique_ptr<Connection> connection_;
};

}  // namespace fleet
