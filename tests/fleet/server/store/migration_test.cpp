/// Databases that older centres have written.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <string>
#include <vector>

#include "fleet/server/store/centre_database.h"
#include "fleet/server/store/centre_schema.h"
#include "fleet/server/store/sqlite_centre_store.h"
#include "fleet/server/store/sqlite_rollout_store.h"
#include "tests/support/scratch_dir.h"

namespace {

/// A database of version 1 with a host and two orders, one of which is over, as its centre wrote
/// it. It stands here in full: tables that are made by today's code would prove nothing.
constexpr const char* kVersion1 = R"(
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
INSERT INTO facts VALUES ('list_until', 1234);
INSERT INTO hosts VALUES
    (5, x'61', 2, 1, x'6d', x'6a', x'73', x'', x'', x'', 1700000000000);
INSERT INTO orders VALUES
    (8, 5, 1, x'6f6e65', x'62', 1, 0, x'646f6e65', 1, x'6a', x'7b7d'),
    (9, 5, 2, x'74776f', x'63', 0, 0, NULL, NULL, NULL, NULL);
PRAGMA user_version = 1;
PRAGMA application_id = 2053207619;
)";

using Names = std::vector<std::string>;

/// The names and statements of all tables, indexes and triggers.
Names schemaOf(sqlite::Database& database) {
    sqlite::Statement rows = database.ask(
        "SELECT type || name || sql FROM sqlite_master WHERE sql IS NOT NULL"
        " ORDER BY 1");
    Names schema;
    while (rows.step())
        schema.push_back(rows.bytes(0));
    return schema;
}

class CentreMigration : public testing::Test {
protected:
    CentreMigration() {
        scratch_.makeDir("centre");
        EXPECT_EQ(::chmod(scratch_.path("centre").c_str(), 0700), 0);
        sqlite::Database(scratch_.path("centre/centre.db")).run(kVersion1);
    }
    ScratchDir scratch_;
};

TEST_F(CentreMigration, KeepsHostsAndOrders) {
    fleet::CentreDatabase database(scratch_.path("centre"));
    fleet::SqliteCentreStore store(database.connection());
    EXPECT_EQ(store.host("a")->last, 2U);
    EXPECT_EQ(store.host("a")->heard, fleet::Moment(1'700'000'000'000));
    EXPECT_EQ(store.order("a", "one")->outcome->state, "done");
    EXPECT_FALSE(store.order("a", "two")->outcome.has_value());
    EXPECT_EQ(store.listUntil(), fleet::Moment(1'234));
    EXPECT_EQ(store.give("a", "three", [](fleet::Number) { return std::string("d"); }), 3U);
}

TEST_F(CentreMigration, LeadsToTheTablesOfANewDatabase) {
    fleet::CentreDatabase database(scratch_.path("centre"));
    sqlite::Database made(":memory:");
    fleet::makeCentreTables(made);
    EXPECT_EQ(schemaOf(database.connection()), schemaOf(made));
    EXPECT_EQ(database.connection().number("PRAGMA user_version"), fleet::kCentreSchemaVersion);
}

TEST_F(CentreMigration, HappensOnce) {
    for (int i = 0; i < 2; ++i) {
        fleet::CentreDatabase database(scratch_.path("centre"));
        fleet::SqliteRolloutStore store(database.connection());
        EXPECT_EQ(store.rollouts(1'000, 10).size(), static_cast<std::size_t>(i));
        if (i > 0) break;
        fleet::Rollout rollout;
        rollout.id = "one";
        store.atomically([&] { store.add(rollout); });
    }
}

TEST_F(CentreMigration, LetsRolloutsLearnOfOrdersThatAreOlder) {
    fleet::CentreDatabase database(scratch_.path("centre"));
    fleet::SqliteRolloutStore store(database.connection());
    fleet::Part part;
    part.rollout = 1;
    part.host = "a";
    part.order = "two";
    store.atomically([&] { store.addPart(part, "bytes"); });
    EXPECT_TRUE(store.told(10).empty());
    fleet::SqliteCentreStore(database.connection())
        .keepOutcome({"a", 2, "two", "journal", "failed", "{}"});
    ASSERT_EQ(store.told(10).size(), 1U);
    EXPECT_EQ(store.told(10)[0].outcome.state, "failed");
    EXPECT_EQ(store.told(10)[0].part.order, "two");
}

}  // namespace
