/// What the console's page reads of the centre.
#pragma once

#include <chrono>
#include <condition_variable>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "ctl/console/answer_room.h"
#include "fleet/https/client/https_client.h"
#include "fleet/operator/console/reads/centre_session.h"
#include "fleet/operator/console/reads/centre_streams.h"
#include "fleet/operator/identity/operator_identity.h"
#include "http/handler.h"

namespace fleet {

/// Asks the centre in the operator's session, on a few connections; further questions wait for
/// their turn. Any thread.
class CentreReads {
public:
    /// Each answer must come within `time`. The identity and its session outlive it. Throws
    /// UrlError or HttpsError if the identity makes no sense.
    CentreReads(const OperatorIdentity& identity, CentreSession& session,
                std::chrono::milliseconds time);
    ~CentreReads();
    CentreReads(const CentreReads&) = delete;
    CentreReads& operator=(const CentreReads&) = delete;

    /// The centre's answer to a GET of the target of this request, a GET or a HEAD, as the centre
    /// gives it; that of its events is a stream. A centre that is away or makes no sense becomes a
    /// reply with status 502, one that does not answer in time one with 504. Blocks.
    http::Answer answer(const http::Request& request);

    /// The centre's answer, whatever its status. Blocks. Throws HttpsError, and ctl::Failure if the
    /// centre gives no session.
    HttpsAnswer get(const std::string& target);

private:
    class LentClient;

    http::Answer events(const http::Request& request);

    const OperatorIdentity& identity_;
    CentreSession& session_;
    const std::chrono::milliseconds time_;
    std::mutex mutex_;
    std::condition_variable returned_;
    std::vector<std::unique_ptr<HttpsClient>> idle_;  ///< most recently used last
    const console::AnswerRoom room_;
    CentreStreams streams_;
};

}  // namespace fleet
