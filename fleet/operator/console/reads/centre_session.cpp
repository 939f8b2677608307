#include "fleet/operator/console/reads/centre_session.h"

#include <chrono>

#include "fleet/https/client/https_error.h"
#include "fleet/https/client/server_trust.h"
#include "fleet/https/client/server_url.h"
#include "fleet/operator/centre/session_opening.h"

namespace fleet {
namespace {

/// Several times what a page of the centre's longest lists takes.
constexpr std::size_t kLongestAnswer = std::size_t{8} * 1024 * 1024;

}  // namespace

HttpsAnswer CentreSession::ask(HttpsClient& client, HttpsRequest request,
                               HttpsClient::Deadline deadline, const Ask& ask) {
    request.mostBytes = kLongestAnswer;
    request.session = opened(client, deadline);
    HttpsAnswer answer = ask(request);
    if (answer.status != kSessionOver) return answer;
    forget(request.session);
    request.session = opened(client, deadline);
    return ask(request);
}

/// The session, which is opened if there is none.
std::string CentreSession::opened(HttpsClient& client, HttpsClient::Deadline deadline) {
    {
        std::unique_lock lock(mutex_);
        const bool isTold = opened_.wait_until(lock, deadline, [this] { return !isOpening_; });
        if (!isTold) throw HttpsError(HttpsError::Kind::TooLate, "the centre gives no session");
        if (!session_.empty()) return session_;
        isOpening_ = true;
    }
    try {
        std::string session = sessionIn(client.ask(sessionOpening(identity_), deadline));
        keep(session);
        return session;
    } catch (...) {
        keep("");
        throw;
    }
}

void CentreSession::keep(const std::string& session) {
    const std::lock_guard lock(mutex_);
    session_ = session;
    isOpening_ = false;
    opened_.notify_all();
}

/// Another reader may have another one by now.
void CentreSession::forget(const std::string& session) {
    const std::lock_guard lock(mutex_);
    if (session_ == session) session_.clear();
}

std::unique_ptr<HttpsClient> centreClient(const OperatorIdentity& identity) {
    return std::make_unique<HttpsClient>(readServerUrl(identity.url),
                                         ServerTrust::byAuthority(identity.authority));
}

}  // namespace fleet
