/// The output of tasks on its way from hosts of the fleet to browsers.
#pragma once

#include <chrono>
#include <cstddef>
#include <map>
#include <mutex>
#include <string>

#include "fleet/loop/run_list.h"
#include "fleet/operator/console/outputs/output_request.h"
#include "fleet/operator/console/reads/centre_session.h"
#include "fleet/operator/identity/operator_identity.h"
#include "http/handler.h"

namespace fleet {

/// Asks hosts through the bus, as `task output -f` does, with questions that the operator's key
/// signs. Each stream has a connection to the centre and a thread, both of which end with its
/// browser, and holds a bounded number of bytes that the browser has not taken. Any thread.
class OutputStreams {
public:
    /// As many as one host shows at a time; a round of questions each, of which the centre keeps
    /// twice as many for an operator.
    static constexpr std::size_t kMost = 4;

    /// Both outlive it. `answerTime` is for each answer of the centre.
    OutputStreams(const OperatorIdentity& identity, CentreSession& session,
                  std::chrono::milliseconds answerTime);
    ~OutputStreams();
    OutputStreams(const OutputStreams&) = delete;
    OutputStreams& operator=(const OutputStreams&) = delete;

    /// Answers with a stream of events, see OutputEvents, once the host has begun to show the
    /// output, and else with why it does not, in the words of the host or the centre. Those beyond
    /// kMost get a reply with status 429. Throws UrlError or HttpsError if the identity makes no
    /// sense, and std::system_error if there can be no thread.
    http::Answer begin(OutputRequest request);

    /// Ends all streams soon.
    void stopAll();

private:
    class Run;

    void removeEnded();
    KeyPair readerFor(const std::string& host);

    const OperatorIdentity& identity_;
    CentreSession& session_;
    const std::chrono::milliseconds answerTime_;
    std::mutex mutex_;
    RunList<Run> runs_;
    /// Of streams that have ended, by host. A host that hears of one again ends what it still shows
    /// it: else the streams that a browser has left would take up its places for a while.
    std::multimap<std::string, KeyPair> readers_;
};

}  // namespace fleet
