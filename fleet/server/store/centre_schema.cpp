#include "fleet/server/store/centre_schema.h"

#include <array>
#include <cstdint>

#include "fleet/server/store/store_error.h"
#include "sqlite/transaction.h"

namespace fleet {
namespace {

/// Tells a centre's database from any other one: "zavC".
constexpr std::int64_t kApplication = 0x7A617643;

/// Texts are bytes, times milliseconds since the epoch. orders.number is 0 if only the host's
/// journal knows of the order. orders.held says that the host gets nothing at present; it stands
/// here because the orders that wait are found by an index, and one host's backlog must not be
/// gone through on the way to the orders of others. orders.state is null while there is no outcome.
constexpr const char* kFirst = R"(
CREATE TABLE facts (name TEXT PRIMARY KEY, value INTEGER NOT NULL) WITHOUT ROWID;
CREATE TABLE hosts (
    id INTEGER PRIMARY KEY, host BLOB NOT NULL UNIQUE, last INTEGER NOT NULL,
    told INTEGER NOT NULL, machine BLOB NOT NULL, journal BLOB NOT NULL, session BLOB NOT NULL,
    earlier_session BLOB NOT NULL, stopped BLOB NOT NULL, unpublished BLOB NOT NULL,
    signing BLOB NOT NULL, name BLOB NOT NULL);
CREATE TABLE orders (
    id INTEGER PRIMARY KEY, host INTEGER NOT NULL, number INTEGER NOT NULL, name BLOB NOT NULL,
    bytes BLOB NOT NULL, published INTEGER NOT NULL, held INTEGER NOT NULL, state BLOB,
    told_number INTEGER, journal BLOB, task BLOB);
CREATE UNIQUE INDEX orders_by_name ON orders (host, name);
CREATE UNIQUE INDEX orders_by_number ON orders (host, number) WHERE number > 0;
CREATE INDEX orders_open ON orders (host, number) WHERE state IS NULL;
CREATE INDEX orders_waiting ON orders (number, host)
    WHERE published = 0 AND held = 0 AND state IS NULL AND number > 0;
CREATE INDEX orders_held ON orders (host) WHERE held = 1;
)";

/// What brings version N to version N + 1, from 0 on. A row is never changed once it was released.
constexpr std::array<const char*, kCentreSchemaVersion> kMigrations = {kFirst};

void migrate(sqlite::Database& database, int version) {
    sqlite::Transaction transaction(database);
    for (int from = version; from < kCentreSchemaVersion; ++from)
        database.run(kMigrations[static_cast<std::size_t>(from)]);
    database.run(("PRAGMA user_version = " + std::to_string(kCentreSchemaVersion)).c_str());
    database.run(("PRAGMA application_id = " + std::to_string(kApplication)).c_str());
    transaction.commit();
}

/// The first line of what the check finds wrong; empty if nothing is.
std::string faultOf(sqlite::Database& database) {
    sqlite::Statement check = database.ask("PRAGMA quick_check(1)");
    const std::string found = check.step() ? check.bytes(0) : std::string("no answer");
    return found == "ok" ? std::string() : found;
}

/// Returns the version.
int insistOnCentre(sqlite::Database& database, const std::string& name) {
    const auto version = static_cast<int>(database.number("PRAGMA user_version"));
    if (version == 0) throw sqlite::DatabaseError::ofDamage("it has no tables");
    if (database.number("PRAGMA application_id") != kApplication) {
        throw StoreError(name + " is another program's database");
    }
    if (version > kCentreSchemaVersion) {
        throw StoreError(name + " has version " + std::to_string(version) +
                         ", written by a newer centre; this one knows versions up to " +
                         std::to_string(kCentreSchemaVersion));
    }
    const std::string fault = faultOf(database);
    if (!fault.empty()) throw sqlite::DatabaseError::ofDamage(fault);
    return version;
}

}  // namespace

void makeCentreTables(sqlite::Database& database) {
    migrate(database, 0);
}

void adoptCentreTables(sqlite::Database& database, const std::string& name) {
    const int version = insistOnCentre(database, name);
    database.run(
        "PRAGMA journal_mode = WAL;"
        "PRAGMA synchronous = FULL;"
        "PRAGMA trusted_schema = OFF;"
        "PRAGMA cache_size = -16384");  // KiB: indexes of a million orders are gone through
    if (version < kCentreSchemaVersion) migrate(database, version);
}

}  // namespace fleet
