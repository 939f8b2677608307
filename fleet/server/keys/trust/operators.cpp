#include "fleet/server/keys/trust/operators.h"

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/invitation.h"
#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/trust/join_refused.h"
#include "fleet/server/keys/trust/names.h"
#include "fleet/server/keys/trust/revocations.h"
#include "fleet/server/keys/trust/validity.h"
#include "sqlite/transaction.h"

namespace fleet {
namespace {

/// What read() wants, in its order.
constexpr const char* kAllOperators =
    "SELECT name, role, commands, products, selector, valid, key, until, withdrawn, expires, "
    "(SELECT count(*) FROM revocations r WHERE r.key = o.key) FROM operators o ORDER BY name, id";
constexpr const char* kWaitingOperators =
    "SELECT name, role, commands, products, selector, valid, key, until, withdrawn, expires, "
    "(SELECT count(*) FROM revocations r WHERE r.key = o.key) FROM operators o "
    "WHERE key IS NOT NULL AND certificate IS NULL "
    "AND NOT EXISTS (SELECT 1 FROM revocations r WHERE r.key = o.key) ORDER BY asked, id";
constexpr const char* kOneOperator =
    "SELECT name, role, commands, products, selector, valid, key, until, withdrawn, expires, "
    "(SELECT count(*) FROM revocations r WHERE r.key = o.key) FROM operators o WHERE key = ?";

OperatorKey::State stateOf(const sqlite::Statement& row) {
    if (row.isNull(6)) {
        return row.integer(8) != 0 ? OperatorKey::State::Withdrawn : OperatorKey::State::Invited;
    }
    if (row.integer(10) != 0) return OperatorKey::State::Revoked;
    return row.isNull(7) ? OperatorKey::State::Waiting : OperatorKey::State::Certified;
}

Certificate certificateFor(const OperatorKey& key, const std::string& fleet, Moment now) {
    Certificate certificate;
    certificate.fleet = fleet;
    certificate.holder = Certificate::Holder::Operator;
    certificate.name = key.grant.name;
    certificate.key = key.key;
    certificate.until = now + key.grant.valid;
    certificate.commands = key.grant.commands;
    certificate.products = key.grant.products;
    certificate.selector = key.grant.selector;
    return certificate;
}

}  // namespace

std::string Operators::invite(const OperatorGrant& wanted,
                              std::chrono::milliseconds invitationValid, Moment now) {
    const OperatorGrant grant = completed(wanted);
    checkInvitationValidity(invitationValid);
    const std::string token = makeJoinToken();
    sqlite::Transaction transaction(database_);
    database_.change("UPDATE operators SET withdrawn = 1 WHERE name = ? AND key IS NULL",
                     grant.name);
    database_.change(
        "INSERT INTO operators (token, name, role, commands, products, selector, valid, expires) "
        "VALUES (?, ?, ?, ?, ?, ?, ?, ?)",
        fingerprintOfToken(token), grant.name, textOf(grant.role), keptTexts(grant.commands),
        keptTexts(grant.products), grant.selector, grant.valid.count(),
        (now + invitationValid).count());
    transaction.commit();
    return token;
}

LoginAnswer Operators::login(std::string_view bytes, const FleetFacts& facts, Moment now) {
    const LoginRequest request = readLogin(bytes);
    const auto fingerprint = fingerprintOfToken(request.token);
    if (!fingerprint || request.fleet != facts.fleet) throw JoinRefused();
    sqlite::Transaction transaction(database_);
    if (RevokedKeys(database_).isRevoked(request.key)) throw JoinRefused();
    sqlite::Statement row = database_.ask(
        "SELECT id, key, withdrawn, expires, certificate FROM operators WHERE token = ?",
        *fingerprint);
    if (!row.step() || row.integer(2) != 0) throw JoinRefused();
    LoginAnswer answer;
    answer.centres = facts.centres;
    if (!row.isNull(1)) {
        if (row.bytes(1) != request.key) throw JoinRefused();
        if (!row.isNull(4)) answer.certificate = row.bytes(4);
        return answer;
    }
    const bool isKnown = database_.number(
                             "SELECT (SELECT count(*) FROM operators WHERE key = ?1) + "
                             "(SELECT count(*) FROM hosts WHERE host = ?1 OR signing = ?1)",
                             request.key) > 0;
    if (isKnown || row.integer(3) <= now.count()) throw JoinRefused();
    database_.change("UPDATE operators SET key = ?, asked = ? WHERE id = ?", request.key,
                     now.count(), row.integer(0));
    transaction.commit();
    return answer;
}

std::vector<OperatorKey> Operators::read(sqlite::Statement& rows) const {
    std::vector<OperatorKey> keys;
    while (rows.step()) {
        OperatorKey key;
        key.grant = {rows.bytes(0),
                     roleOf(rows.bytes(1)),
                     textsKept(rows.bytes(2)),
                     textsKept(rows.bytes(3)),
                     rows.bytes(4),
                     std::chrono::milliseconds(rows.integer(5))};
        key.state = stateOf(rows);
        key.key = rows.bytes(6);
        key.until = Moment(rows.isNull(6) ? rows.integer(9) : rows.integer(7));
        keys.push_back(key);
    }
    return keys;
}

std::vector<OperatorKey> Operators::waiting() const {
    sqlite::Statement rows = database_.ask(kWaitingOperators);
    return read(rows);
}

std::vector<OperatorKey> Operators::all() const {
    sqlite::Statement rows = database_.ask(kAllOperators);
    return read(rows);
}

void Operators::certify(const std::vector<std::string>& keys, const RootKeys& root, Moment now) {
    sqlite::Transaction transaction(database_);
    for (const std::string& key : keys) {
        sqlite::Statement row = database_.ask(kOneOperator, key);
        const std::vector<OperatorKey> found = read(row);
        if (found.empty() || found.front().state != OperatorKey::State::Waiting) {
            throw KeysError("no key " + key + " waits to be certified; nothing was certified");
        }
        const Certificate certificate = certificateFor(found.front(), root.fleet, now);
        database_.change("UPDATE operators SET certificate = ?, until = ? WHERE key = ?",
                         signCertificate(certificate, root.root), certificate.until.count(), key);
    }
    transaction.commit();
}

std::optional<OperatorGrant> Operators::grantOf(const std::string& key, Moment now) const {
    sqlite::Statement row = database_.ask(kOneOperator, key);
    const std::vector<OperatorKey> found = read(row);
    if (found.empty() || found.front().state != OperatorKey::State::Certified ||
        found.front().until <= now) {
        return std::nullopt;
    }
    return found.front().grant;
}

}  // namespace fleet
