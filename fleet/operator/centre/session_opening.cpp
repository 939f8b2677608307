#include "fleet/operator/centre/session_opening.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "fleet/bus/messages/session.h"
#include "fleet/operator/centre/answers.h"

namespace fleet {

HttpsRequest sessionOpening(const OperatorIdentity& identity) {
    const SessionRequest wanted{identity.fleet, identity.key.publicKey(), identity.url, wallClock(),
                                makeSessionNonce()};
    return {"POST", "/v1/sessions", signSessionRequest(wanted, identity.key),
            "application/octet-stream"};
}

std::string sessionIn(const HttpsAnswer& answer) {
    std::string session = memberText(documentIn(answer), "session");
    const bool isToken =
        !session.empty() &&
        std::all_of(session.begin(), session.end(), [](char c) { return c > ' ' && c < '\x7f'; });
    if (!isToken) throw senseless("it has no session");
    return session;
}

}  // namespace fleet
