/// What the running centre has of the bus's keys.
///
/// It has no account's own key and not the operator's: they stay with the root, as nothing that the
/// centre does all day needs them. What it has are
/// - two users, of its own account and of the server's, each by a token that its account has
///   signed. A thief cannot make more of them, and the next rotation ends these;
/// - the key that signs hosts, because hosts enrol while the root is locked away. It gives a host's
///   rights and no other;
/// - the key that signs accounts in the operator's name, because a host that was stolen must be cut
///   off at once and not when somebody has fetched the root. It lets nobody do more on the bus than
///   the centre does anyway, and nothing on the bus lets anybody give an order. The operator's
///   token names it, so a new one of that takes it away.
#pragma once

#include <string>

#include "fleet/bus/accounts/fleet_accounts.h"
#include "fleet/server/keys/files/key_lines.h"

namespace fleet {

struct BusUser {
    KeyPair key;
    std::string token;
};

struct BusKeys {
    BusUser centre;  ///< of the centre's account
    BusUser system;  ///< of the server's own
    KeyPair hostSigner;
    KeyPair accountSigner;
    /// Earlier users. They stand with the newer ones, so that a file tells of both at once: the
    /// centre that is started with the new ones is the one that has the old ones refused.
    Revocations earlierCentre;
    Revocations earlierSystem;
};

/// Users of the accounts, made by the accounts' own keys.
BusUser makeBusUser(const KeyPair& account, const char* name, TokenTime issuedAt);

KeyLines linesOfBusKeys(const BusKeys& keys);
/// Throws KeysError.
BusKeys readBusKeys(const ReadKeyLines& lines);

}  // namespace fleet
