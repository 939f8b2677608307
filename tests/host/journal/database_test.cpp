#include "host/journal/database.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "support/scratch_dir.h"

namespace {

using host::Database;
using host::DatabaseError;

TEST(JournalDatabase, KeepsBytesAsTheyAre) {
    Database database(":memory:");
    database.run("CREATE TABLE t (a, b, c, d)");
    const std::string bytes("\0\xFF'x", 4);
    database.change("INSERT INTO t VALUES (?, ?, ?, ?)", bytes, "", std::int64_t{1} << 40,
                    std::optional<int>());
    host::Statement row = database.ask("SELECT a, b, c, d FROM t");
    ASSERT_TRUE(row.step());
    EXPECT_EQ(row.bytes(0), bytes);
    EXPECT_EQ(row.bytes(1), "");
    EXPECT_FALSE(row.isNull(1));
    EXPECT_EQ(row.integer(2), std::int64_t{1} << 40);
    EXPECT_EQ(row.maybeInteger(3), std::nullopt);
    EXPECT_FALSE(row.step());
}

TEST(JournalDatabase, SaysWhatIsWrong) {
    Database database(":memory:");
    EXPECT_THROW(database.run("CREATE"), DatabaseError);
    EXPECT_THROW(database.ask("SELECT x FROM nothing"), DatabaseError);
    EXPECT_THROW(Database("/nowhere/at/all"), DatabaseError);
}

TEST(JournalDatabase, KnowsAFileThatIsNoDatabase) {
    const ScratchDir scratch;
    const std::string file = scratch.write("journal.db", std::string(8192, 'x'));
    try {
        Database database(file);
        database.number("SELECT count(*) FROM sqlite_master");
        FAIL() << "it was read";
    } catch (const DatabaseError& error) {
        EXPECT_TRUE(error.damaged()) << error.what();
    }
}

TEST(JournalDatabase, IsNobodyElses) {
    const ScratchDir scratch;
    const mode_t before = ::umask(0);
    Database database(scratch.path("journal.db"));
    database.run("PRAGMA journal_mode = WAL; CREATE TABLE t (a)");
    ::umask(before);
    for (const char* name : {"journal.db", "journal.db-wal", "journal.db-shm"}) {
        struct stat found {};
        ASSERT_EQ(::stat(scratch.path(name).c_str(), &found), 0) << name;
        EXPECT_EQ(found.st_mode & 0777U, 0600U) << name;
    }
}

TEST(JournalDatabase, FollowsNoLink) {
    const ScratchDir scratch;
    scratch.write("elsewhere", "");
    ASSERT_EQ(::symlink(scratch.path("elsewhere").c_str(), scratch.path("journal.db").c_str()), 0);
    EXPECT_THROW(Database(scratch.path("journal.db")), DatabaseError);
}

}  // namespace
