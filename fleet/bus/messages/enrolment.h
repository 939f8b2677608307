/// How a host joins the fleet: what it tells the centre, and what it is told.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/accounts/nkey.h"

namespace fleet {

/// From the host. It holds the token and goes over HTTPS, to a server that the invitation's
/// authority vouches for, and nowhere else.
struct EnrolmentRequest {
    std::string fleet;    ///< the fleet that it wants to join
    std::string token;    ///< of its invitation
    std::string host;     ///< the bus key that it has made
    std::string signing;  ///< the signing key that it has made, another one
    std::string machine;  ///< the machine's identity, at most 128 bytes
};

/// From the centre.
struct EnrolmentAnswer {
    std::string name;                  ///< the host's, for people
    std::string userToken;             ///< lets the bus key into the bus
    std::vector<std::string> busUrls;  ///< where that is
    std::string serverName;            ///< the DNS name in the certificates of the bus's servers
    std::string authority;             ///< the certificate that vouches for those, PEM
    /// What the root has certified of the centre's signing keys, the newest first; a link reads
    /// each with readCertificate(). There is more than one while an older key is being replaced.
    std::vector<std::string> centres;
};

/// Signed by both keys, so that nobody enrols a key that is another one's. Throws
/// std::invalid_argument if the keys are not those of the request.
std::string signEnrolment(const EnrolmentRequest& request, const KeyPair& bus,
                          const KeyPair& signing);
/// A request that both of its keys have signed. Throws MessageError otherwise, which never tells
/// anything about the token.
EnrolmentRequest readEnrolment(std::string_view bytes);

/// As a JSON text. It needs no signature: it comes over the connection that was asked on, and what
/// a host believes the centre is, the root has signed.
std::string enrolmentAnswerText(const EnrolmentAnswer& answer);
/// Throws MessageError.
EnrolmentAnswer readEnrolmentAnswer(std::string_view text);

}  // namespace fleet
