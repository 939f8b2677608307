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
    heard INTEGER NOT NULL);
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

/// The keys with which links sign, names of hosts for people, and roll-outs. States, causes and
/// failures are numbers of rollout_records.h. rollouts.wait and .parallel are null where the plan
/// names none, .wave_end while a wave goes on. outcome is empty before a part is over.
/// rollout_orders has the orders that wait for their release, and rollout_cancels those that cancel
/// others.
///
/// An outcome that the centre keeps is noted in rollout_news by a trigger, whoever has told it and
/// however it came: so nobody has to look through orders for it, and none is missed by a kill.
constexpr const char* kSecond = R"(
ALTER TABLE hosts ADD COLUMN signing BLOB NOT NULL DEFAULT x'';
ALTER TABLE hosts ADD COLUMN name BLOB NOT NULL DEFAULT x'';
ALTER TABLE hosts ADD COLUMN told_time INTEGER NOT NULL DEFAULT 0;
CREATE TABLE rollouts (
    id INTEGER PRIMARY KEY AUTOINCREMENT, name BLOB NOT NULL UNIQUE, operator BLOB NOT NULL,
    operator_key BLOB NOT NULL, kind BLOB NOT NULL, product BLOB NOT NULL, selector BLOB NOT NULL,
    created INTEGER NOT NULL, plan_waves BLOB NOT NULL, plan_failures BLOB NOT NULL,
    pause INTEGER NOT NULL, wait INTEGER, parallel INTEGER, hosts INTEGER NOT NULL,
    most_failures INTEGER NOT NULL, state INTEGER NOT NULL, cause INTEGER NOT NULL,
    reason BLOB NOT NULL, since INTEGER NOT NULL, waves INTEGER NOT NULL, wave INTEGER NOT NULL,
    began INTEGER NOT NULL, wave_end INTEGER);
CREATE INDEX rollouts_running ON rollouts (id) WHERE state = 0;
CREATE TABLE rollout_parts (
    rollout INTEGER NOT NULL, place INTEGER NOT NULL, host INTEGER NOT NULL, wave INTEGER NOT NULL,
    name BLOB NOT NULL, expires INTEGER NOT NULL, tries INTEGER NOT NULL, state INTEGER NOT NULL,
    number INTEGER NOT NULL, outcome BLOB NOT NULL, reason BLOB NOT NULL, failure INTEGER NOT NULL,
    cancel BLOB NOT NULL, PRIMARY KEY (rollout, place)) WITHOUT ROWID;
CREATE UNIQUE INDEX rollout_parts_by_host ON rollout_parts (rollout, host);
CREATE UNIQUE INDEX rollout_parts_by_order ON rollout_parts (host, name);
CREATE INDEX rollout_parts_by_state ON rollout_parts (rollout, state, wave, outcome);
CREATE INDEX rollout_parts_failed ON rollout_parts (rollout, failure) WHERE failure > 0;
CREATE TABLE rollout_orders (
    rollout INTEGER NOT NULL, place INTEGER NOT NULL, bytes BLOB NOT NULL,
    UNIQUE (rollout, place));
CREATE TABLE rollout_cancels (
    rollout INTEGER NOT NULL, place INTEGER NOT NULL, bytes BLOB NOT NULL,
    UNIQUE (rollout, place));
CREATE TABLE rollout_news (
    rollout INTEGER NOT NULL, place INTEGER NOT NULL, PRIMARY KEY (rollout, place)) WITHOUT ROWID;
CREATE TRIGGER orders_told AFTER UPDATE OF state ON orders WHEN new.state IS NOT NULL BEGIN
    INSERT OR IGNORE INTO rollout_news
        SELECT rollout, place FROM rollout_parts WHERE host = new.host AND name = new.name;
END;
)";

/// What hosts have told about themselves, the newest of each. taken is when its inventory
/// was made, and -1 without one; labels are its own.
constexpr const char* kThird = R"(
CREATE TABLE host_facts (
    host INTEGER PRIMARY KEY, told INTEGER NOT NULL, heard INTEGER NOT NULL, name BLOB NOT NULL,
    labels BLOB NOT NULL, link BLOB NOT NULL, version BLOB NOT NULL, journal BLOB NOT NULL,
    blocked BLOB NOT NULL, taken INTEGER NOT NULL, inventory BLOB NOT NULL);
)";

/// What brings version N to version N + 1, from 0 on. A row is never changed once it was released.
constexpr std::array<const char*, kCentreSchemaVersion> kMigrations = {kFirst, kSecond, kThird};

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
