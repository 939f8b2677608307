#include "fleet/server/keys/trust/host_enrolment.h"

#include <algorithm>

#include "fleet/bus/messages/invitation.h"
#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/trust/join_refused.h"
#include "fleet/server/keys/trust/names.h"
#include "fleet/server/keys/trust/revocations.h"
#include "fleet/server/keys/trust/validity.h"
#include "sqlite/transaction.h"

namespace fleet {
namespace {

/// How long an invitation that nobody has used is remembered.
constexpr Moment kRemembered = std::chrono::hours(24 * 30);

}  // namespace

struct HostEnrolment::Row {
    std::int64_t id = 0;
    bool replaces = false;
    bool isWithdrawn = false;
    bool isTaken = false;  ///< somebody has come with the token
    Moment expires{};
    EnrolledHost host;
};

std::string HostEnrolment::invite(const HostInvitation& invitation, Moment now) {
    checkName(invitation.name);
    checkInvitationValidity(invitation.valid);
    const std::string token = makeJoinToken();
    sqlite::Transaction transaction(database_);
    if (!invitation.replaces && hasCountingHost(invitation.name)) {
        throw KeysError("there is a host \"" + invitation.name +
                        "\" already; have it replaced, or choose another name");
    }
    database_.change("DELETE FROM hosts WHERE host IS NULL AND expires < ?",
                     (now - kRemembered).count());
    database_.change("UPDATE hosts SET withdrawn = 1 WHERE name = ? AND host IS NULL",
                     invitation.name);
    database_.change(
        "INSERT INTO hosts (token, name, labels, replaces, expires) VALUES (?, ?, ?, ?, ?)",
        fingerprintOfToken(token), invitation.name, keptLabels(invitation.labels),
        invitation.replaces ? 1 : 0, (now + invitation.valid).count());
    transaction.commit();
    return token;
}

bool HostEnrolment::knows(std::string_view token) const {
    return rowOf(token).has_value();
}

EnrolmentAnswer HostEnrolment::redeem(std::string_view bytes, const FleetDirectory& directory,
                                      HostRegister& hosts, Moment now) {
    const EnrolmentRequest request = readEnrolment(bytes);
    const FleetFacts facts = directory.facts();
    const BusKeys bus = directory.bus();
    const std::string authority = directory.authority();
    const Row row = take(request, facts.fleet, now);
    hosts.enrol(row.host);
    // The time is that of the first try, so a repeated request brings the same token.
    const auto issuedAt = std::chrono::duration_cast<TokenTime>(row.host.joined);
    return {row.host.name,
            hostUserToken(bus.hostSigner, facts.accounts.hosts,
                          {row.host.host, row.host.name, issuedAt, {}}),
            facts.busUrls,
            facts.names.front(),
            authority,
            facts.centres};
}

std::optional<HostEnrolment::Row> HostEnrolment::rowOf(std::string_view token) const {
    const std::optional<std::string> fingerprint = fingerprintOfToken(token);
    if (!fingerprint) return std::nullopt;
    sqlite::Statement found = database_.ask(
        "SELECT id, replaces, withdrawn, expires, host, signing, machine, name, labels, joined "
        "FROM hosts WHERE token = ?",
        *fingerprint);
    if (!found.step()) return std::nullopt;
    Row row;
    row.id = found.integer(0);
    row.replaces = found.integer(1) != 0;
    row.isWithdrawn = found.integer(2) != 0;
    row.expires = Moment(found.integer(3));
    row.isTaken = !found.isNull(4);
    row.host = {found.bytes(4),
                found.bytes(5),
                found.bytes(6),
                found.bytes(7),
                labelsKept(found.bytes(8)),
                Moment(found.integer(9))};
    return row;
}

/// The token is looked for and taken in one transaction, so one of two who bring it at the same
/// instant comes second.
HostEnrolment::Row HostEnrolment::take(const EnrolmentRequest& request, const std::string& fleet,
                                       Moment now) {
    sqlite::Transaction transaction(database_);
    std::optional<Row> row = rowOf(request.token);
    if (!row || row->isWithdrawn || request.fleet != fleet) throw JoinRefused();
    if (row->isTaken) {
        const bool isSame = row->host.host == request.host &&
                            row->host.signing == request.signing &&
                            row->host.machine == request.machine;
        if (!isSame || !isCounting(request.host)) throw JoinRefused();
        return *row;
    }
    if (row->expires <= now || !isFresh(request)) throw JoinRefused();
    if (row->replaces) RevokedKeys(database_).revokeHostsNamed(row->host.name, now);
    row->host.host = request.host;
    row->host.signing = request.signing;
    row->host.machine = request.machine;
    row->host.joined = now;
    database_.change("UPDATE hosts SET host = ?, signing = ?, machine = ?, joined = ? WHERE id = ?",
                     request.host, request.signing, request.machine, now.count(), row->id);
    transaction.commit();
    return *row;
}

/// Neither key has ever been in the fleet, in any part. A key that is revoked never comes back.
bool HostEnrolment::isFresh(const EnrolmentRequest& request) const {
    return database_.number(
               "SELECT (SELECT count(*) FROM hosts WHERE host IN (?1, ?2)) + "
               "(SELECT count(*) FROM hosts WHERE signing IN (?1, ?2)) + "
               "(SELECT count(*) FROM operators WHERE key IN (?1, ?2)) + "
               "(SELECT count(*) FROM revocations WHERE key IN (?1, ?2))",
               request.host, request.signing) == 0;
}

bool HostEnrolment::isCounting(const std::string& host) const {
    return !RevokedKeys(database_).isRevoked(host);
}

bool HostEnrolment::hasCountingHost(const std::string& name) const {
    return database_.number(
               "SELECT count(*) FROM hosts h WHERE name = ? AND host IS NOT NULL AND NOT EXISTS "
               "(SELECT 1 FROM revocations r WHERE r.key = h.host)",
               name) > 0;
}

void HostEnrolment::tell(HostRegister& hosts) const {
    sqlite::Statement rows = database_.ask(
        "SELECT host, signing, machine, name, labels, joined FROM hosts h WHERE host IS NOT NULL "
        "AND NOT EXISTS (SELECT 1 FROM revocations r WHERE r.key = h.host) ORDER BY id");
    while (rows.step()) {
        hosts.enrol({rows.bytes(0), rows.bytes(1), rows.bytes(2), rows.bytes(3),
                     labelsKept(rows.bytes(4)), Moment(rows.integer(5))});
    }
}

}  // namespace fleet
