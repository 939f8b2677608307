#include "fleet/server/keys/trust/trust_schema.h"

#include <array>
#include <cstdint>

#include "fleet/server/keys/files/keys_error.h"
#include "sqlite/transaction.h"

namespace fleet {
namespace {

/// Tells this database from any other one: "zavT".
constexpr std::int64_t kTrustApplication = 0x7A617654;

/// Texts are bytes, times milliseconds since the epoch, lists and labels JSON. A token is kept as
/// fingerprintOfToken() only. An invitation is open while it has no key and is not withdrawn. A key
/// counts no longer when it stands in revocations, from where nothing is ever removed; until is
/// when what it was certified for ends, null if that is not known.
constexpr const char* kFirstTrust = R"(
CREATE TABLE hosts (
    id INTEGER PRIMARY KEY, token BLOB NOT NULL UNIQUE, name BLOB NOT NULL, labels BLOB NOT NULL,
    replaces INTEGER NOT NULL, expires INTEGER NOT NULL, withdrawn INTEGER NOT NULL DEFAULT 0,
    host BLOB UNIQUE, signing BLOB UNIQUE, machine BLOB, joined INTEGER);
CREATE INDEX hosts_by_name ON hosts (name);
CREATE INDEX hosts_invited ON hosts (expires) WHERE host IS NULL;
CREATE TABLE operators (
    id INTEGER PRIMARY KEY, token BLOB NOT NULL UNIQUE, name BLOB NOT NULL, role BLOB NOT NULL,
    commands BLOB NOT NULL, products BLOB NOT NULL, selector BLOB NOT NULL,
    valid INTEGER NOT NULL, expires INTEGER NOT NULL, withdrawn INTEGER NOT NULL DEFAULT 0,
    key BLOB UNIQUE, asked INTEGER, certificate BLOB, until INTEGER);
CREATE INDEX operators_by_name ON operators (name);
CREATE TABLE revocations (
    id INTEGER PRIMARY KEY AUTOINCREMENT, key BLOB NOT NULL UNIQUE, kind INTEGER NOT NULL,
    since INTEGER NOT NULL, until INTEGER);
)";

/// What brings version N to version N + 1, from 0 on. A row is never changed once it was released.
constexpr std::array<const char*, kTrustSchemaVersion> kTrustMigrations = {kFirstTrust};

void bringUpToDate(sqlite::Database& database) {
    sqlite::Transaction transaction(database);
    // Another process may have done it while this one waited.
    const auto version = static_cast<int>(database.number("PRAGMA user_version"));
    for (int from = version; from < kTrustSchemaVersion; ++from)
        database.run(kTrustMigrations[static_cast<std::size_t>(from)]);
    database.run(("PRAGMA user_version = " + std::to_string(kTrustSchemaVersion)).c_str());
    database.run(("PRAGMA application_id = " + std::to_string(kTrustApplication)).c_str());
    transaction.commit();
}

void insistOnSoundness(sqlite::Database& database) {
    sqlite::Statement check = database.ask("PRAGMA quick_check(1)");
    const std::string found = check.step() ? check.bytes(0) : std::string("no answer");
    if (found != "ok") throw sqlite::DatabaseError::ofDamage(found);
}

}  // namespace

void makeTrustTables(sqlite::Database& database) {
    bringUpToDate(database);
}

void adoptTrustTables(sqlite::Database& database, const std::string& name) {
    const auto version = static_cast<int>(database.number("PRAGMA user_version"));
    if (version == 0) throw sqlite::DatabaseError::ofDamage("it has no tables");
    if (database.number("PRAGMA application_id") != kTrustApplication) {
        throw KeysError(name + " is another program's database");
    }
    if (version > kTrustSchemaVersion) {
        throw KeysError(name + " has version " + std::to_string(version) +
                        ", written by a newer centre; this one knows versions up to " +
                        std::to_string(kTrustSchemaVersion));
    }
    insistOnSoundness(database);
    database.run(
        "PRAGMA journal_mode = WAL; PRAGMA synchronous = FULL; PRAGMA trusted_schema = OFF");
    if (version < kTrustSchemaVersion) bringUpToDate(database);
}

}  // namespace fleet
