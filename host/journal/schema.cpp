#include "host/journal/schema.h"

#include <array>
#include <cstdio>
#include <random>

namespace host {
namespace {

/// Times are in microseconds since the epoch. Texts are in the local code page, so they are bytes.
///
/// tasks.state and tasks.way are values of TaskState and TaskWay. tasks.run is the run of the host
/// in which a task was handed to the plug-in, tasks.turn its place among all that were. conditions
/// holds a request as it came; of a task that is over only what may be shown. outcomes.id numbers
/// the events; task is null for a row that belongs to none. outcomes.kind is a value of EventKind.
constexpr const char* kFirst = R"(
CREATE TABLE facts (name TEXT PRIMARY KEY, value BLOB NOT NULL) WITHOUT ROWID;
CREATE TABLE runs (
    run INTEGER PRIMARY KEY AUTOINCREMENT, boot BLOB NOT NULL, session INTEGER NOT NULL,
    started INTEGER NOT NULL, clean INTEGER NOT NULL DEFAULT 0);
CREATE TABLE tasks (
    number INTEGER PRIMARY KEY AUTOINCREMENT, transid BLOB NOT NULL, command BLOB NOT NULL,
    product BLOB NOT NULL, asker BLOB NOT NULL, state INTEGER NOT NULL, way INTEGER NOT NULL,
    answered INTEGER NOT NULL, accepted INTEGER NOT NULL, started INTEGER, ended INTEGER,
    expires INTEGER, forced INTEGER NOT NULL, run INTEGER, turn INTEGER, interruptions INTEGER NOT NULL DEFAULT 0,
    once BLOB, reply BLOB NOT NULL, reason BLOB NOT NULL, guard BLOB NOT NULL, hint BLOB NOT NULL,
    cancel INTEGER NOT NULL DEFAULT 0, begun INTEGER NOT NULL DEFAULT 0);
CREATE INDEX tasks_by_transid ON tasks (transid, number);
CREATE INDEX tasks_unfinished ON tasks (number) WHERE ended IS NULL;
CREATE INDEX tasks_by_turn ON tasks (turn);
CREATE INDEX tasks_by_end ON tasks (ended) WHERE ended IS NOT NULL;
CREATE TABLE conditions (
    task INTEGER NOT NULL, place INTEGER NOT NULL, name BLOB NOT NULL, operator INTEGER NOT NULL,
    value BLOB NOT NULL, PRIMARY KEY (task, place)) WITHOUT ROWID;
CREATE TABLE outcomes (id INTEGER PRIMARY KEY AUTOINCREMENT, task INTEGER, row BLOB NOT NULL);
CREATE INDEX outcomes_by_task ON outcomes (task, id);
CREATE TABLE commands (
    task INTEGER NOT NULL, place INTEGER NOT NULL, line BLOB NOT NULL, pid INTEGER NOT NULL,
    started INTEGER NOT NULL, ended INTEGER, exit INTEGER, signal INTEGER, error BLOB NOT NULL,
    timed_out INTEGER NOT NULL, executed_nothing INTEGER NOT NULL, out BLOB NOT NULL,
    err BLOB NOT NULL, PRIMARY KEY (task, place)) WITHOUT ROWID;
)";

constexpr const char* kSecond = "ALTER TABLE outcomes ADD COLUMN kind INTEGER NOT NULL DEFAULT 0";

/// What brings version N to version N + 1, from 0 on. A row is never changed once it was released.
constexpr std::array<const char*, kSchemaVersion> kMigrations = {kFirst, kSecond};

std::string randomBytes(std::size_t count) {
    std::random_device source;
    std::string bytes;
    while (bytes.size() < count)
        bytes.push_back(static_cast<char>(source() & 0xFFU));
    return bytes;
}

std::string hexadecimal(const std::string& bytes) {
    std::string text;
    for (const char byte : bytes) {
        char digits[3];
        std::snprintf(digits, sizeof digits, "%02x", static_cast<unsigned char>(byte));
        text += digits;
    }
    return text;
}

void setUp(Database& database) {
    database.run(
        "PRAGMA journal_mode = WAL;"
        "PRAGMA synchronous = FULL;"
        "PRAGMA secure_delete = ON;"
        "PRAGMA trusted_schema = OFF");
}

void migrate(Database& database, int version) {
    for (int from = version; from < kSchemaVersion; ++from)
        database.run(kMigrations[static_cast<std::size_t>(from)]);
    database.run(("PRAGMA user_version = " + std::to_string(kSchemaVersion)).c_str());
}

std::string fact(Database& database, const char* name) {
    Statement found = database.ask("SELECT value FROM facts WHERE name = CAST(? AS TEXT)", name);
    return found.step() ? found.bytes(0) : std::string();
}

void enterFact(Database& database, const char* name, const std::string& value) {
    database.change("INSERT OR IGNORE INTO facts VALUES (CAST(? AS TEXT), ?)", name, value);
}

void replaceFact(Database& database, const char* name, const std::string& value) {
    database.change("INSERT OR REPLACE INTO facts VALUES (CAST(? AS TEXT), ?)", name, value);
}

}  // namespace

void prepareSchema(Database& database) {
    const auto version = static_cast<int>(database.number("PRAGMA user_version"));
    if (version > kSchemaVersion) {
        throw NewerSchema("it has version " + std::to_string(version) +
                          ", written by a newer host; this one knows versions up to " +
                          std::to_string(kSchemaVersion));
    }
    setUp(database);
    database.run("BEGIN IMMEDIATE");
    migrate(database, version);
    enterFact(database, "identity", hexadecimal(randomBytes(8)));
    enterFact(database, "key", randomBytes(32));
    database.run("COMMIT");
}

std::string integrityFault(Database& database) {
    Statement check = database.ask("PRAGMA integrity_check(1)");
    const std::string found = check.step() ? check.bytes(0) : std::string("no answer");
    return found == "ok" ? std::string() : found;
}

std::string journalIdentity(Database& database) {
    return fact(database, "identity");
}

std::string journalKey(Database& database) {
    return fact(database, "key");
}

void setJournalKey(Database& database, const std::string& key) {
    replaceFact(database, "key", key);
}

std::string formerIdentity(Database& database) {
    return fact(database, "former");
}

void setFormerIdentity(Database& database, const std::string& identity) {
    replaceFact(database, "former", identity);
}

}  // namespace host
