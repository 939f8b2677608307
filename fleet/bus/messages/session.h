/// How an operator opens a session at the centre, in which it asks for other things.
#pragma once

#include <string>
#include <string_view>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/values.h"

namespace fleet {

/// From the operator. It names the centre, so that no other one can use it there.
struct SessionRequest {
    std::string fleet;
    std::string key;    ///< the operator's public key
    std::string url;    ///< of the centre that is asked
    Moment time{};      ///< the operator's clock
    std::string nonce;  ///< 32 hexadecimal digits in lower case, made up for this request
};

/// A nonce that nobody has used: 128 random bits.
std::string makeSessionNonce();

/// Signed by the operator's key. Throws std::invalid_argument if that is not the request's.
std::string signSessionRequest(const SessionRequest& request, const KeyPair& key);
/// A request that its key has signed. Throws MessageError otherwise. Whether it is fresh, for this
/// centre and not used before, who answers decides.
SessionRequest readSessionRequest(std::string_view bytes);

}  // namespace fleet
