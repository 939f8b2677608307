/// How operators get their certificates.
///
/// 1. An administrator adds an operator, with what they may do, and gets an invitation for them.
/// 2. The operator's zavctl makes a key, which never leaves its machine, and comes with the
///    invitation's token. The key waits here; zavctl shows it and asks again and again.
/// 3. The administrator brings the root and certifies the keys that wait. They compare each with
///    what the operator has read out: a centre that somebody else has taken over could have put
///    its own key there, and the root would make it an operator.
/// 4. At its next question zavctl gets the certificate.
///
/// Nothing that can certify is ever at the centre between two such moments: that is why a bad
/// centre cannot invent orders.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/messages/login.h"
#include "fleet/bus/messages/values.h"
#include "fleet/server/keys/directory/fleet_facts.h"
#include "fleet/server/keys/directory/root_file.h"
#include "fleet/server/keys/trust/operator_grant.h"
#include "sqlite/database.h"

namespace fleet {

/// An operator's key and what it stands for.
struct OperatorKey {
    enum class State {
        Invited,    ///< there is no key yet
        Waiting,    ///< for the root
        Certified,  ///< perhaps over, see until
        Revoked,
        Withdrawn  ///< the invitation counts no longer
    };
    OperatorGrant grant;
    State state = State::Invited;
    std::string key;  ///< "" without one
    Moment until{};   ///< when the invitation or the certificate ends
};

/// Works on a connection of a TrustDatabase, which outlives it. One thread at a time for each
/// object, and any number of objects and processes. Throws sqlite::DatabaseError; then nothing was
/// changed.
class Operators {
public:
    explicit Operators(sqlite::Database& database) : database_(database) {}

    /// Returns the token, which is kept nowhere. An operator may have several keys, for a second
    /// machine or before a certificate ends; an invitation that was not used is withdrawn. Throws
    /// KeysError if the grant makes no sense or the invitation is good for too long.
    std::string invite(const OperatorGrant& grant, std::chrono::milliseconds invitationValid,
                       Moment now);

    /// An operator comes with a request, in the bytes of signLogin(): for the first time before the
    /// invitation ends, and with the same key as often as it likes. Throws MessageError if the
    /// bytes are no request, and JoinRefused for everything that is wrong with what it asks.
    LoginAnswer login(std::string_view request, const FleetFacts& facts, Moment now);

    /// The keys that wait for the root.
    std::vector<OperatorKey> waiting() const;
    /// Signs the keys, all or none of them; what was granted counts from now on. Throws KeysError,
    /// which names it, if one of them does not wait.
    void certify(const std::vector<std::string>& keys, const RootKeys& root, Moment now);

    /// All that were ever added, by their names.
    std::vector<OperatorKey> all() const;
    /// What the holder of a key may do at the centre now: nothing unless it is certified, and
    /// neither revoked nor over.
    std::optional<OperatorGrant> grantOf(const std::string& key, Moment now) const;

private:
    std::vector<OperatorKey> read(sqlite::Statement& rows) const;

    sqlite::Database& database_;
};

}  // namespace fleet
