#include "sqlite/database.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <functional>

#include "support/scratch_dir.h"

namespace {

using sqlite::Database;
using sqlite::DatabaseError;

TEST(SqliteDatabase, KeepsBytesAsTheyAre) {
    Database database(":memory:");
    database.run("CREATE TABLE t (a, b, c, d)");
    const std::string bytes("\0\xFF'x", 4);
    database.change("INSERT INTO t VALUES (?, ?, ?, ?)", bytes, "", std::int64_t{1} << 40,
                    std::optional<int>());
    sqlite::Statement row = database.ask("SELECT a, b, c, d FROM t");
    ASSERT_TRUE(row.step());
    EXPECT_EQ(row.bytes(0), bytes);
    EXPECT_EQ(row.bytes(1), "");
    EXPECT_FALSE(row.isNull(1));
    EXPECT_EQ(row.integer(2), std::int64_t{1} << 40);
    EXPECT_EQ(row.maybeInteger(3), std::nullopt);
    EXPECT_FALSE(row.step());
}

TEST(SqliteDatabase, SaysWhatIsWrong) {
    Database database(":memory:");
    EXPECT_THROW(database.run("CREATE"), DatabaseError);
    EXPECT_THROW(database.ask("SELECT x FROM nothing"), DatabaseError);
    EXPECT_THROW(Database("/nowhere/at/all"), DatabaseError);
}

TEST(SqliteDatabase, KnowsAFileThatIsNoDatabase) {
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

TEST(SqliteDatabase, IsNobodyElses) {
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

/// A process of its own, which waits before it begins. It inherits none of this one's files and
/// locks if it is made before they are opened.
class Other {
public:
    explicit Other(const std::function<void()>& work) {
        int ends[2];
        EXPECT_EQ(::pipe(ends), 0);
        pid_ = ::fork();
        if (pid_ == 0) {
            ::close(ends[1]);
            char word = 0;
            const bool told = ::read(ends[0], &word, 1) == 1;
            if (told) work();
            ::_exit(told ? 0 : 1);
        }
        ::close(ends[0]);
        word_ = ends[1];
    }
    /// Lets it begin; returns its exit status.
    int run() {
        EXPECT_EQ(::write(word_, "x", 1), 1);
        ::close(word_);
        int status = 0;
        EXPECT_EQ(::waitpid(pid_, &status, 0), pid_);
        return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }

private:
    pid_t pid_ = 0;
    int word_ = -1;
};

TEST(SqliteDatabase, KeepsWhatIsInItsLogWhenAnotherProcessReadsAndEnds) {
    const ScratchDir scratch;
    const std::string file = scratch.path("journal.db");
    Other other([&] {
        Database database(file);
        if (database.number("SELECT count(*) FROM t") != 1) ::_exit(2);
    });
    Database writer(file);
    writer.run("PRAGMA journal_mode = WAL; CREATE TABLE t (a); INSERT INTO t VALUES (1)");
    Database reader(file);
    EXPECT_EQ(reader.number("SELECT count(*) FROM t"), 1);
    EXPECT_EQ(other.run(), 0);
    ASSERT_TRUE(scratch.exists("journal.db-wal")) << "the last one to leave removes it";
    writer.run("INSERT INTO t VALUES (2)");
    // What a kill would leave.
    for (const char* end : {"", "-wal"}) {
        std::filesystem::copy_file(file + end, scratch.path(std::string("left.db") + end));
    }
    Database left(scratch.path("left.db"));
    EXPECT_EQ(left.number("SELECT count(*) FROM t"), 2);
}

TEST(SqliteDatabase, FollowsNoLink) {
    const ScratchDir scratch;
    scratch.write("elsewhere", "");
    ASSERT_EQ(::symlink(scratch.path("elsewhere").c_str(), scratch.path("journal.db").c_str()), 0);
    EXPECT_THROW(Database(scratch.path("journal.db")), DatabaseError);
}

}  // namespace
