/// The operator's session at the centre, for whoever asks there on behalf of a browser.
#pragma once

#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>
#include <string>

#include "fleet/https/client/https_client.h"
#include "fleet/operator/identity/operator_identity.h"

namespace fleet {

/// The status with which the centre answers when there is no session, or none any more.
constexpr unsigned kSessionOver = 401;

/// One session, which all connections share. It is opened when it is first needed, and anew when it
/// has ended. Any thread.
class CentreSession {
public:
    /// Sends a request on a client; the session is in the request.
    using Ask = std::function<HttpsAnswer(const HttpsRequest& request)>;

    /// The identity outlives it.
    explicit CentreSession(const OperatorIdentity& identity) : identity_(identity) {}
    CentreSession(const CentreSession&) = delete;
    CentreSession& operator=(const CentreSession&) = delete;

    /// What `ask` gets for the request, whatever its status. The session is opened on `client`,
    /// which nobody else uses meanwhile. Blocks until the deadline at most. Throws HttpsError,
    /// ctl::Failure if the centre gives no session, and what `ask` throws.
    HttpsAnswer ask(HttpsClient& client, HttpsRequest request, HttpsClient::Deadline deadline,
                    const Ask& ask);

private:
    std::string opened(HttpsClient& client, HttpsClient::Deadline deadline);
    void keep(const std::string& session);
    void forget(const std::string& session);

    const OperatorIdentity& identity_;
    std::mutex mutex_;
    std::condition_variable opened_;
    std::string session_;     ///< "" if there is none
    bool isOpening_ = false;  ///< one asks for it, and the others wait
};

/// A client for the centre of this identity. Throws UrlError or HttpsError if that makes no sense.
std::unique_ptr<HttpsClient> centreClient(const OperatorIdentity& identity);

}  // namespace fleet
