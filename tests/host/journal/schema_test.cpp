#include "host/journal/schema.h"

#include <gtest/gtest.h>

namespace {

using host::Database;

TEST(JournalSchema, ANewJournalGetsAnIdentityOfItsOwn) {
    Database first(":memory:");
    Database second(":memory:");
    host::prepareSchema(first);
    host::prepareSchema(second);
    EXPECT_EQ(host::journalIdentity(first).size(), 16U);
    EXPECT_NE(host::journalIdentity(first), host::journalIdentity(second));
    EXPECT_EQ(host::journalKey(first).size(), 32U);
    EXPECT_NE(host::journalKey(first), host::journalKey(second));
}

TEST(JournalSchema, IsPreparedOnlyOnce) {
    Database database(":memory:");
    host::prepareSchema(database);
    const std::string identity = host::journalIdentity(database);
    host::prepareSchema(database);
    EXPECT_EQ(host::journalIdentity(database), identity);
    EXPECT_EQ(database.number("PRAGMA user_version"), host::kSchemaVersion);
    EXPECT_EQ(host::integrityFault(database), "");
}

TEST(JournalSchema, RowsOfTheFirstVersionBecomeEvents) {
    Database database(":memory:");
    database.run(
        "CREATE TABLE facts (name TEXT PRIMARY KEY, value BLOB NOT NULL) WITHOUT ROWID;"
        "CREATE TABLE outcomes (id INTEGER PRIMARY KEY AUTOINCREMENT, task INTEGER, row BLOB NOT "
        "NULL);"
        "INSERT INTO facts VALUES ('identity', x'61');"
        "INSERT INTO outcomes VALUES (7, 1, x'62');"
        "PRAGMA user_version = 1");
    host::prepareSchema(database);
    EXPECT_EQ(database.number("PRAGMA user_version"), host::kSchemaVersion);
    EXPECT_EQ(host::journalIdentity(database), "a");
    EXPECT_EQ(database.number("SELECT id FROM outcomes WHERE kind = 0 AND row = x'62'"), 7);
}

TEST(JournalSchema, OneOfANewerHostIsLeftAsItIs) {
    Database database(":memory:");
    database.run("CREATE TABLE future (a); PRAGMA user_version = 1000");
    EXPECT_THROW(host::prepareSchema(database), host::NewerSchema);
    EXPECT_EQ(database.number("SELECT count(*) FROM sqlite_master"), 1);
    EXPECT_EQ(database.number("PRAGMA user_version"), 1000);
}

}  // namespace
