/// The centre over HTTPS.
#pragma once

#include <chrono>
#include <string>

#include "fleet/https/client/https_client.h"
#include "fleet/operator/centre/centre.h"
#include "fleet/operator/identity/operator_identity.h"

namespace fleet {

/// Opens a session with the operator's key when it is first asked something, and another one when
/// that has ended.
class HttpsCentre : public Centre {
public:
    /// Each request must be answered within a minute, and before the deadline. Throws
    /// UrlError or HttpsError if the identity makes no sense.
    HttpsCentre(const OperatorIdentity& identity, HttpsClient::Deadline deadline);

    nlohmann::json get(const std::string& target) override;
    nlohmann::json post(const std::string& target, const nlohmann::json& body) override;
    nlohmann::json postBytes(const std::string& target, std::string bytes) override;

    /// From now on each request must be answered within this time.
    void answersWithin(std::chrono::seconds time) { answerTime_ = time; }

private:
    nlohmann::json request(HttpsRequest request);
    HttpsAnswer ask(const HttpsRequest& request);
    void openSession();

    const OperatorIdentity identity_;
    const HttpsClient::Deadline deadline_;
    std::chrono::seconds answerTime_{60};
    HttpsClient client_;
    std::string session_;  ///< "" if there is none
};

}  // namespace fleet
