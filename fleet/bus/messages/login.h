/// How an operator's key is certified: what its holder tells the centre, and what it is told.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/accounts/nkey.h"

namespace fleet {

/// From the operator's machine. The same request is sent again until the answer has a certificate:
/// the root that signs it is not at the centre, so somebody has to fetch it.
struct LoginRequest {
    std::string fleet;
    std::string token;  ///< of the invitation
    std::string key;    ///< the operator's key, which never leaves its machine
};

/// From the centre.
struct LoginAnswer {
    /// What the root has signed, for readCertificate(); nothing while it is waited for.
    std::optional<std::string> certificate;
    std::vector<std::string> centres;  ///< as in EnrolmentAnswer
};

/// Signed by the operator's key. Throws std::invalid_argument if that is not the request's.
std::string signLogin(const LoginRequest& request, const KeyPair& key);
/// A request that its key has signed. Throws MessageError otherwise.
LoginRequest readLogin(std::string_view bytes);

std::string loginAnswerText(const LoginAnswer& answer);
/// Throws MessageError.
LoginAnswer readLoginAnswer(std::string_view text);

}  // namespace fleet
