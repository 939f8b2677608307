/// A client of one HTTPS server.
#pragma once

#include <chrono>
#include <cstddef>
#include <functional>
#include <memory>
#include <string>
#include <string_view>

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
    /// For "Last-Event-ID": the event after which a stream is to go on; likewise.
    std::string lastEventId = {};
    std::size_t mostBytes = 16UL * 1024 * 1024;  ///< an answer with a longer body is refused
};

struct HttpsAnswer {
    unsigned status = 0;
    std::string body;
    std::string retryAfter = {};  ///< what its field Retry-After says; "" if it has none
};

/// Sends one request after the other, on one connection as long as the server keeps that open. One
/// thread at a time. What waits, waits until a deadline; only the look-up of a name takes as long
/// as the system lets it.
class HttpsClient {
public:
    using Deadline = std::chrono::steady_clock::time_point;

    /// Connects with the first request. Throws HttpsError(NotTrusted) if the trust makes no sense.
    HttpsClient(ServerUrl url, ServerTrust trust);
    ~HttpsClient();
    HttpsClient(const HttpsClient&) = delete;
    HttpsClient& operator=(const HttpsClient&) = delete;

    /// The answer, whatever its status. Throws HttpsError. A GET is sent again, once, when it went
    /// out on a connection that the server had closed meanwhile; nothing else is sent twice.
    HttpsAnswer ask(const HttpsRequest& request, Deadline deadline);

    /// Gets a piece of an answer's body, as it came over the wire; false if no more is wanted.
    using TakePiece = std::function<bool(std::string_view piece)>;

    /// Told that an answer with status 200 has begun, and what its field Last-Event-ID says; "" if
    /// it has none.
    using OnBegin = std::function<void(const std::string& position)>;

    /// Reads an answer that may go on for ever, such as a stream of events. Its head has to come
    /// until the deadline; after that nothing may come for `quiet` at most, so whoever answers has
    /// to show from time to time that it is there. Returns when the server has ended the answer or
    /// `take` wants no more, with the status; the connection is closed then. Any other status than
    /// 200 ends with the whole answer, as ask() gives it, and `take` gets nothing. Throws
    /// HttpsError, Cancelled after cancel(), and what the two throw.
    HttpsAnswer read(const HttpsRequest& request, Deadline deadline,
                     std::chrono::milliseconds quiet, const TakePiece& take,
                     const OnBegin& onBegin = {});

    /// Ends what is asked now, and all that is asked later, as cancelled. Any thread, at any time.
    void cancel();

    /// The certificate of the authority that vouched for the server at the latest connection, PEM;
    /// "" before there was one. Who knew only its fingerprint keeps it.
    const std::string& authority() const;

private:
    class Connection;

    const ServerUrl url_;
    std::unique_ptr<Connection> connection_;
};

}  // namespace fleet
