/// Signed statements about keys, which the bus's server reads: JSON web tokens by ed25519 keys.
#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

#include "fleet/bus/accounts/nkey.h"

namespace fleet {

/// Seconds since 1970, as tokens tell times.
using TokenTime = std::chrono::seconds;

/// What every token says.
struct TokenHead {
    std::string subject;  ///< the public key that it is about
    std::string name;     ///< for people; rights never depend on it
    TokenTime issuedAt{};
    std::optional<TokenTime> expires;  ///< never, if there is none
};

/// The token. `nats` is the JSON object of what it says to the server; its type is among it.
std::string signedToken(const TokenHead& head, const std::string& nats, const KeyPair& issuer);

/// Whether the holder of the public key has signed the token.
bool isTokenSignedBy(std::string_view token, std::string_view issuer);

}  // namespace fleet
