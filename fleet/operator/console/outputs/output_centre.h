/// The centre as a stream of output asks it.
#pragma once

#include <chrono>
#include <nlohmann/json_fwd.hpp>
#include <string>

#include "fleet/https/client/https_client.h"
#include "fleet/operator/centre/centre.h"
#include "fleet/operator/console/reads/centre_session.h"

namespace fleet {

/// On a client of its own, in the session that all share.
class OutputCentre final : public Centre {
public:
    /// Both outlive it. Whoever cancels the client ends all that is asked here.
    /// `answerTime` is for each answer.
    OutputCentre(CentreSession& session, HttpsClient& client, std::chrono::milliseconds answerTime)
        : session_(session), client_(client), answerTime_(answerTime) {}

    nlohmann::json get(const std::string& target) override;
    nlohmann::json post(const std::string& target, const nlohmann::json& body) override;
    nlohmann::json postBytes(const std::string& target, std::string bytes) override;

private:
    nlohmann::json ask(HttpsRequest request);

    CentreSession& session_;
    HttpsClient& client_;
    const std::chrono::milliseconds answerTime_;
};

}  // namespace fleet
