#include "fleet/server/keys/trust/account_tokens.h"

namespace fleet {

std::vector<std::string> accountTokens(const FleetFacts& facts, const BusKeys& bus,
                                       const Revocations& revokedHosts, TokenTime issuedAt) {
    return {controlToken(facts.accounts, bus.accountSigner, issuedAt, bus.earlierCentre),
            hostsToken(facts.accounts, bus.accountSigner, issuedAt, revokedHosts),
            systemToken(facts.accounts, bus.accountSigner, issuedAt, bus.earlierSystem)};
}

}  // namespace fleet
