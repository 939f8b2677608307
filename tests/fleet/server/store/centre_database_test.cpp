#include "fleet/server/store/centre_database.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <functional>
#include <string>

#include "fleet/server/store/sqlite_centre_store.h"
#include "fleet/server/store/store_error.h"
#include "tests/support/scratch_dir.h"

namespace {

namespace fs = std::filesystem;
using fleet::CentreDatabase;
using fleet::Number;
using fleet::SqliteCentreStore;

mode_t modeOf(const std::string& path) {
    struct stat found {};
    return ::stat(path.c_str(), &found) == 0 ? found.st_mode & 0777U : 0;
}

class CentreDatabaseFile : public testing::Test {
protected:
    std::string directory() const { return scratch_.path("centre"); }
    std::string file() const { return scratch_.path("centre/centre.db"); }

    /// Opens the database, does something to it, and closes it.
    void with(const std::function<void(SqliteCentreStore&)>& act) const {
        CentreDatabase database(directory());
        SqliteCentreStore store(database.connection());
        act(store);
    }
    static void enrol(SqliteCentreStore& store) {
        fleet::HostRecord record;
        record.host = "a";
        store.keepHost(record);
    }
    static Number give(SqliteCentreStore& store, const std::string& order) {
        return store.give("a", order, [](Number) { return std::string("sealed"); }).value();
    }
    void make() const {
        with([](SqliteCentreStore& store) {
            enrol(store);
            give(store, "one");
        });
    }
    /// What opening it says; "" if it opens.
    std::string refusal() const {
        try {
            CentreDatabase database(directory());
            return "";
        } catch (const fleet::StoreError& error) {
            return error.what();
        }
    }
    /// Insists that it is refused in such words, and that the file stays as it is.
    void expectRefusal(const std::string& words) const {
        const std::string before = scratch_.read("centre/centre.db");
        EXPECT_NE(refusal().find(words), std::string::npos) << refusal();
        EXPECT_EQ(scratch_.read("centre/centre.db"), before);
    }

    ScratchDir scratch_;
};

TEST_F(CentreDatabaseFile, KeepsItsRecordsWhenItIsOpenedAgain) {
    make();
    with([](SqliteCentreStore& store) {
        EXPECT_EQ(store.order("a", "one")->number, Number{1});
        EXPECT_EQ(give(store, "two"), Number{2});
    });
}

TEST_F(CentreDatabaseFile, CommitsDurably) {
    CentreDatabase database(directory());
    EXPECT_EQ(database.connection().number("PRAGMA synchronous"), 2);
    sqlite::Statement mode = database.connection().ask("PRAGMA journal_mode");
    ASSERT_TRUE(mode.step());
    EXPECT_EQ(mode.bytes(0), "wal");
}

TEST_F(CentreDatabaseFile, BelongsToItsUserAlone) {
    const mode_t before = ::umask(0);
    CentreDatabase database(directory());
    SqliteCentreStore store(database.connection());
    enrol(store);
    ::umask(before);
    EXPECT_EQ(modeOf(directory()), mode_t{0700});
    for (const char* const ending : {"", "-wal", "-shm"})
        EXPECT_EQ(modeOf(file() + ending), mode_t{0600}) << ending;
}

TEST_F(CentreDatabaseFile, MakesACopyThatWasPutBackPrivate) {
    make();
    fs::permissions(file(), fs::perms(0644));
    EXPECT_EQ(refusal(), "");
    EXPECT_EQ(modeOf(file()), mode_t{0600});
}

TEST_F(CentreDatabaseFile, RefusesADirectoryThatOthersMayUse) {
    make();
    fs::permissions(directory(), fs::perms(0750));
    expectRefusal("may be used by others");
}

TEST_F(CentreDatabaseFile, IsUsedOnce) {
    {
        const CentreDatabase database(directory());
        EXPECT_NE(refusal().find("another process uses"), std::string::npos);
    }
    EXPECT_EQ(refusal(), "");
}

TEST_F(CentreDatabaseFile, RefusesOneOfANewerCentre) {
    make();
    sqlite::Database(file()).run("PRAGMA user_version = 99");
    expectRefusal("has version 99, written by a newer centre");
}

TEST_F(CentreDatabaseFile, RefusesAnotherProgramsDatabase) {
    make();
    sqlite::Database(file()).run("PRAGMA application_id = 1");
    expectRefusal("is another program's database");
}

TEST_F(CentreDatabaseFile, LeavesADamagedOneAsItIs) {
    make();
    scratch_.write("centre/centre.db", "this is no database at all, but text of some length");
    expectRefusal("is damaged");
}

TEST_F(CentreDatabaseFile, LeavesATruncatedOneAsItIs) {
    make();
    const std::string content = scratch_.read("centre/centre.db");
    scratch_.write("centre/centre.db", content.substr(0, content.size() - 8'192));
    expectRefusal("is damaged");
}

TEST_F(CentreDatabaseFile, DoesNotTakeAnEmptyFileForANewDatabase) {
    make();
    scratch_.write("centre/centre.db", "");
    expectRefusal("is damaged (it has no tables)");
}

TEST_F(CentreDatabaseFile, DoesNotReplaceOneOfWhichChangesAreLeft) {
    make();
    fs::rename(file(), file() + "-wal");
    EXPECT_NE(refusal().find("is missing, but changes to it are there"), std::string::npos);
    EXPECT_FALSE(fs::exists(file()));
}

TEST_F(CentreDatabaseFile, BacksUpWhatIsCommittedWhileItIsInUse) {
    const std::string copy = scratch_.path("copy.db");
    with([&](SqliteCentreStore& store) { enrol(store); });
    {
        CentreDatabase database(directory());
        SqliteCentreStore store(database.connection());
        give(store, "one");
        const auto backUpWithin = [&](Number) {
            database.backup(copy);
            return std::string("sealed");
        };
        store.give("a", "two", backUpWithin);
        give(store, "three");
    }
    EXPECT_EQ(modeOf(copy), mode_t{0600});
    fs::copy_file(copy, file(), fs::copy_options::overwrite_existing);
    with([](SqliteCentreStore& store) {
        EXPECT_EQ(store.order("a", "one")->number, Number{1});
        EXPECT_FALSE(store.order("a", "two").has_value());
        EXPECT_EQ(give(store, "four"), Number{2});
    });
}

TEST_F(CentreDatabaseFile, ReplacesAnOlderBackupWhenTheNewOneIsComplete) {
    const std::string copy = scratch_.path("copy.db");
    make();
    CentreDatabase database(directory());
    database.backup(copy);
    const std::string first = scratch_.read("copy.db");
    SqliteCentreStore store(database.connection());
    give(store, "two");
    scratch_.write("copy.db.new", "what a backup has left that did not end");
    database.backup(copy);
    EXPECT_NE(scratch_.read("copy.db"), first);
    EXPECT_FALSE(scratch_.exists("copy.db.new"));
}

TEST_F(CentreDatabaseFile, LeavesAnOlderBackupWhenANewOneFails) {
    const std::string copy = scratch_.write("copy.db", "older");
    scratch_.write("copy.db.new/in the way", "");
    make();
    const CentreDatabase database(directory());
    EXPECT_THROW(database.backup(copy), fleet::StoreError);
    EXPECT_EQ(scratch_.read("copy.db"), "older");
}

TEST_F(CentreDatabaseFile, IsNoBackupOfItself) {
    make();
    const CentreDatabase database(directory());
    EXPECT_THROW(database.backup(file()), fleet::StoreError);
}

TEST_F(CentreDatabaseFile, RefusesToGiveANumberTwice) {
    with([](SqliteCentreStore& store) {
        enrol(store);
        give(store, "one");
        fleet::OrderRecord other;
        other.host = "a";
        other.number = 1;
        other.order = "other";
        EXPECT_THROW(store.adopt(other), sqlite::DatabaseError);
        EXPECT_FALSE(store.order("a", "other").has_value());
        EXPECT_EQ(give(store, "two"), Number{2});
    });
}

TEST_F(CentreDatabaseFile, IsAnOlderOneOnceACopyWasPutBack) {
    make();
    const std::string copy = scratch_.path("copy.db");
    fleet::backUpCentre(directory(), copy);
    with([](SqliteCentreStore& store) {
        give(store, "two");
        EXPECT_FALSE(store.isPutBack());
    });
    fleet::putBackCentre(directory(), copy);
    EXPECT_EQ(modeOf(file()), 0600U);
    with([](SqliteCentreStore& store) {
        EXPECT_TRUE(store.order("a", "one").has_value());
        EXPECT_FALSE(store.order("a", "two").has_value());
        EXPECT_TRUE(store.isPutBack());
        store.noteCompleted();
    });
    with([](SqliteCentreStore& store) { EXPECT_FALSE(store.isPutBack()); });
}

TEST_F(CentreDatabaseFile, IsPutBackAlsoInThePlaceOfADamagedOneOrOfNone) {
    make();
    const std::string copy = scratch_.path("copy.db");
    fleet::backUpCentre(directory(), copy);
    for (const char* const left : {"", "-wal", "-shm", "-journal"})
        scratch_.write(std::string("centre/centre.db") + left, "damaged");
    fleet::putBackCentre(directory(), copy);
    with([](SqliteCentreStore& store) { EXPECT_TRUE(store.order("a", "one").has_value()); });
    fs::remove_all(directory());
    fleet::putBackCentre(directory(), copy);
    with([](SqliteCentreStore& store) { EXPECT_TRUE(store.order("a", "one").has_value()); });
}

TEST_F(CentreDatabaseFile, IsNotReplacedByWhatIsNoCopyNorWhileItIsUsed) {
    make();
    const std::string copy = scratch_.path("copy.db");
    fleet::backUpCentre(directory(), copy);
    scratch_.write("nonsense", "no database");
    EXPECT_ANY_THROW(fleet::putBackCentre(directory(), scratch_.path("nonsense")));
    EXPECT_THROW(fleet::putBackCentre(directory(), scratch_.path("nothing")), fleet::StoreError);
    {
        const CentreDatabase inUse(directory());
        EXPECT_THROW(fleet::putBackCentre(directory(), copy), fleet::StoreError);
    }
    with([](SqliteCentreStore& store) {
        EXPECT_TRUE(store.order("a", "one").has_value());
        EXPECT_FALSE(store.isPutBack());
    });
}

}  // namespace
