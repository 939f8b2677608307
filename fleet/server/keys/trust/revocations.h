/// Keys that count no longer. There is no way back: who is to be let in again gets a new key.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "fleet/bus/accounts/fleet_accounts.h"
#include "fleet/bus/messages/values.h"
#include "sqlite/database.h"

namespace fleet {

struct RevokedKey {
    enum class Kind { Operator = 0, Host = 1 };
    std::string key;   ///< an operator's signing key, or a host's bus key
    std::string name;  ///< whose it was; "" if that is not known
    Kind kind = Kind::Operator;
    Moment since{};
};

/// Works on a connection of a TrustDatabase, which outlives it. Throws sqlite::DatabaseError; then
/// nothing was changed.
class RevokedKeys {
public:
    explicit RevokedKeys(sqlite::Database& database) : database_(database) {}

    /// All keys of the operator, and invitations that were not used. Given a key, that one, even if
    /// nothing is known of it: its certificate may be older than what this database knows. Returns
    /// the keys that counted until now. Throws KeysError if there is no such operator, or if the
    /// key is a host's.
    std::vector<std::string> revokeOperator(const std::string& nameOrKey, Moment now);
    /// The same with a host, of which either key may be given: the bus key is what is revoked.
    std::vector<std::string> revokeHost(const std::string& nameOrKey, Moment now);

    bool isRevoked(const std::string& key) const;

    /// For Reply::revoked: signing keys of operators whose certificates might still be taken. Those
    /// that ended 30 days ago are left out, so that the list stays short; no clock of a host that
    /// takes part is that wrong.
    std::vector<std::string> operators(Moment now) const;
    /// For the account of the hosts: for ever, whatever the clocks say.
    Revocations hosts() const;
    /// All, the latest first.
    std::vector<RevokedKey> all() const;
    /// Rises with each revocation, whichever process makes it: who passes the lists on looks at
    /// this first.
    std::int64_t count() const;

private:
    friend class HostEnrolment;  // a host that replaces another one has that revoked
    /// Within the caller's transaction. False if it was revoked before.
    bool add(const std::string& key, RevokedKey::Kind kind, Moment now,
             std::optional<std::int64_t> until) const;
    void insistOn(RevokedKey::Kind kind, const std::string& key) const;
    std::string busKeyOf(const std::string& key) const;
    std::vector<std::string> revokeHostsNamed(const std::string& name, Moment now) const;

    sqlite::Database& database_;
};

}  // namespace fleet
