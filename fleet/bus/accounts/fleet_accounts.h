/// The accounts of a fleet on its bus, and who may do what there.
///
/// The centre's account has all streams. The hosts' account has none: it sees what the
/// centre's account exports, and of that each host sees only what bears its own key. The server's
/// own account manages the other two.
#pragma once

#include <map>
#include <string>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/accounts/token.h"

namespace fleet {

/// The keys of a fleet. All of them are secret.
struct FleetKeys {
    KeyPair root;           ///< the operator's: says who signs the accounts besides itself
    KeyPair control;        ///< the account of the centre
    KeyPair hosts;          ///< the account of the hosts
    KeyPair hostSigner;     ///< signs hosts, and can give nothing but a host's rights
    KeyPair system;         ///< the server's own account
    KeyPair accountSigner;  ///< signs accounts for the operator, which can replace it

    static FleetKeys make();
};

/// The public halves of the accounts' keys: what it takes to describe the accounts anew.
struct AccountKeys {
    std::string control;
    std::string hosts;
    std::string hostSigner;
    std::string system;

    static AccountKeys of(const FleetKeys& keys);
};

/// Keys of users of one account that are no longer taken, with the time up to which tokens are
/// refused. A token that is issued later is taken again.
using Revocations = std::map<std::string, TokenTime>;

/// The time for a key that never counts again, whatever the clocks say: the end of the year 9999.
constexpr TokenTime kForEver{253'402'300'799};

/// What the server is told of the operator and of each account. A later token of an account takes
/// the place of an earlier one; it must be issued in a later second.
std::string operatorToken(const FleetKeys& keys, TokenTime issuedAt);
std::string controlToken(const FleetKeys& keys, TokenTime issuedAt,
                         const Revocations& revocations = {});
std::string hostsToken(const FleetKeys& keys, TokenTime issuedAt,
                       const Revocations& revocations = {});
std::string systemToken(const FleetKeys& keys, TokenTime issuedAt);

// The same by the key that signs accounts, FleetKeys::accountSigner, without any other secret.
std::string controlToken(const AccountKeys& accounts, const KeyPair& signer, TokenTime issuedAt,
                         const Revocations& revocations);
std::string hostsToken(const AccountKeys& accounts, const KeyPair& signer, TokenTime issuedAt,
                       const Revocations& revocations);
std::string systemToken(const AccountKeys& accounts, const KeyPair& signer, TokenTime issuedAt,
                        const Revocations& revocations);

/// A host's own token. Its rights follow from its key: they stand in the account, which replaces
/// the key in each subject. Throws std::invalid_argument if the key is none of a user.
std::string hostUserToken(const KeyPair& hostSigner, const std::string& hostsAccount,
                          const TokenHead& head);

/// Somebody who may do everything in an account: the centre in its own, or who changes accounts in
/// the server's. Throws std::invalid_argument if the key is none of a user.
std::string fullUserToken(const KeyPair& account, const TokenHead& head);

/// The part of the server's configuration that names the operator and the accounts. The server
/// keeps the newest token of each account in that folder.
std::string accountsConfiguration(const FleetKeys& keys, const std::string& folder,
                                  TokenTime issuedAt);

/// Where a host finds its answers: ConnectionOptions::inboxPrefix.
std::string inboxPrefixOf(const std::string& hostKey);

}  // namespace fleet
