#include "fleet/server/keys/trust/revocations.h"

#include "fleet/server/keys/files/keys_error.h"
#include "sqlite/transaction.h"

namespace fleet {
namespace {

constexpr Moment kClocksApart = std::chrono::hours(24 * 30);

}  // namespace

/// A key that stood in the wrong list would go on counting where it is used.
void RevokedKeys::insistOn(RevokedKey::Kind kind, const std::string& key) const {
    const bool isHost = kind == RevokedKey::Kind::Host;
    const std::int64_t others =
        database_.number(isHost ? "SELECT count(*) FROM operators WHERE key = ?"
                                : "SELECT count(*) FROM hosts WHERE host = ?1 OR signing = ?1",
                         key);
    const std::int64_t revoked =
        database_.number("SELECT count(*) FROM revocations WHERE key = ? AND kind <> ?", key,
                         static_cast<int>(kind));
    if (others + revoked > 0) {
        throw KeysError(key + (isHost ? " is an operator's key" : " is a host's key"));
    }
}

bool RevokedKeys::add(const std::string& key, RevokedKey::Kind kind, Moment now,
                      std::optional<std::int64_t> until) const {
    return database_.change(
               "INSERT INTO revocations (key, kind, since, until) VALUES (?, ?, ?, ?) "
               "ON CONFLICT (key) DO NOTHING",
               key, static_cast<int>(kind), now.count(), until) == 1;
}

std::vector<std::string> RevokedKeys::revokeOperator(const std::string& nameOrKey, Moment now) {
    std::vector<std::string> revoked;
    sqlite::Transaction transaction(database_);
    const bool isKey = isPublicKey(nameOrKey, KeyKind::User);
    if (isKey) insistOn(RevokedKey::Kind::Operator, nameOrKey);
    sqlite::Statement known =
        database_.ask(isKey ? "SELECT key, until FROM operators WHERE key = ?"
                            : "SELECT key, until FROM operators WHERE name = ?",
                      nameOrKey);
    bool isKnown = false;
    while (known.step()) {
        isKnown = true;
        if (!known.isNull(0) &&
            add(known.bytes(0), RevokedKey::Kind::Operator, now, known.maybeInteger(1))) {
            revoked.push_back(known.bytes(0));
        }
    }
    if (!isKnown && !isKey) throw KeysError("there is no operator \"" + nameOrKey + "\"");
    if (!isKnown && add(nameOrKey, RevokedKey::Kind::Operator, now, std::nullopt)) {
        revoked.push_back(nameOrKey);
    }
    if (!isKey) {
        database_.change("UPDATE operators SET withdrawn = 1 WHERE name = ? AND key IS NULL",
                         nameOrKey);
    }
    transaction.commit();
    return revoked;
}

std::vector<std::string> RevokedKeys::revokeHostsNamed(const std::string& name, Moment now) const {
    std::vector<std::string> revoked;
    sqlite::Statement known =
        database_.ask("SELECT host FROM hosts WHERE name = ? AND host IS NOT NULL", name);
    while (known.step()) {
        if (add(known.bytes(0), RevokedKey::Kind::Host, now, std::nullopt)) {
            revoked.push_back(known.bytes(0));
        }
    }
    return revoked;
}

std::vector<std::string> RevokedKeys::revokeHost(const std::string& nameOrKey, Moment now) {
    std::vector<std::string> revoked;
    sqlite::Transaction transaction(database_);
    if (isPublicKey(nameOrKey, KeyKind::User)) {
        insistOn(RevokedKey::Kind::Host, nameOrKey);
        const std::string key = busKeyOf(nameOrKey);
        if (add(key, RevokedKey::Kind::Host, now, std::nullopt)) revoked = {key};
    } else {
        if (database_.number("SELECT count(*) FROM hosts WHERE name = ?", nameOrKey) == 0) {
            throw KeysError("there is no host \"" + nameOrKey + "\"");
        }
        revoked = revokeHostsNamed(nameOrKey, now);
        database_.change("UPDATE hosts SET withdrawn = 1 WHERE name = ? AND host IS NULL",
                         nameOrKey);
    }
    transaction.commit();
    return revoked;
}

/// A host is known by its bus key, and revoked by it; the other one may be what is at hand.
std::string RevokedKeys::busKeyOf(const std::string& key) const {
    sqlite::Statement host =
        database_.ask("SELECT host FROM hosts WHERE signing = ? AND host IS NOT NULL", key);
    return host.step() ? host.bytes(0) : key;
}

bool RevokedKeys::isRevoked(const std::string& key) const {
    return database_.number("SELECT count(*) FROM revocations WHERE key = ?", key) > 0;
}

std::vector<std::string> RevokedKeys::operators(Moment now) const {
    std::vector<std::string> keys;
    sqlite::Statement rows = database_.ask(
        "SELECT key FROM revocations WHERE kind = ? AND (until IS NULL OR until > ?) ORDER BY id",
        static_cast<int>(RevokedKey::Kind::Operator), (now - kClocksApart).count());
    while (rows.step())
        keys.push_back(rows.bytes(0));
    return keys;
}

Revocations RevokedKeys::hosts() const {
    Revocations keys;
    sqlite::Statement rows = database_.ask("SELECT key FROM revocations WHERE kind = ?",
                                           static_cast<int>(RevokedKey::Kind::Host));
    while (rows.step())
        keys[rows.bytes(0)] = kForEver;
    return keys;
}

std::vector<RevokedKey> RevokedKeys::all() const {
    std::vector<RevokedKey> keys;
    sqlite::Statement rows = database_.ask(
        "SELECT r.key, r.kind, r.since, coalesce(o.name, h.name, x'') FROM revocations r "
        "LEFT JOIN operators o ON o.key = r.key LEFT JOIN hosts h ON h.host = r.key "
        "ORDER BY r.id DESC");
    while (rows.step()) {
        keys.push_back({rows.bytes(0), rows.bytes(3),
                        static_cast<RevokedKey::Kind>(rows.integer(1)), Moment(rows.integer(2))});
    }
    return keys;
}

std::int64_t RevokedKeys::count() const {
    return database_.number("SELECT coalesce(max(id), 0) FROM revocations");
}

}  // namespace fleet
