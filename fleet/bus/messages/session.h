/// How an operator opens a session with the centre.
#pragma once

#include <string>
#include <string_view>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/values.h"

namespace fleet {

/// From the operator's machine, over HTTPS. Whoever has seen one can do nothing with it: it counts
/// once, for a few minutes, at that centre.
struct SessionRequest {
    std::string fleet;
    std::string key;    ///< the operator's
    std::string url;    ///< the centre's, as FleetFacts::url has it
    Moment time{};      ///< on the operator's clock
    std::string nonce;  ///< 32 hexadecimal digits in lower case
};

/// Signed by the operator's key. Throws std::invalid_argument if that is not the request's.
std::string signSessionRequest(const SessionRequest& request, const KeyPair& key);
/// A request that its key has signed. Throws MessageError otherwise.
SessionRequest readSessionRequest(std::string_view bytes);

}  // namespace fleet
