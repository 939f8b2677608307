#include "host/journal/state_directory.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <optional>

#include "host/process/start_error.h"
#include "support/scratch_dir.h"

namespace {

using host::StartError;
using host::StateDirectory;

mode_t modeOf(const std::string& path) {
    struct stat found {};
    EXPECT_EQ(::stat(path.c_str(), &found), 0) << path;
    return found.st_mode & 0777U;
}

class StateDirectories : public testing::Test {
protected:
    ScratchDir scratch;
};

TEST_F(StateDirectories, AreMadeForTheirOwnerOnly) {
    const mode_t before = ::umask(0);
    const StateDirectory state(scratch.path("a/b/"));
    ::umask(before);
    EXPECT_EQ(modeOf(scratch.path("a")), 0700U);
    EXPECT_EQ(modeOf(scratch.path("a/b")), 0700U);
    EXPECT_EQ(state.database(), scratch.path("a/b/journal.db"));
}

TEST_F(StateDirectories, ThatOthersMayWriteToAreRefused) {
    ASSERT_EQ(::chmod(scratch.makeDir("state").c_str(), 0770), 0);
    EXPECT_THROW(StateDirectory(scratch.path("state")), StartError);
}

TEST_F(StateDirectories, CannotBeMadeBelowAFile) {
    scratch.write("file", "");
    EXPECT_THROW(StateDirectory(scratch.path("file/state")), StartError);
    EXPECT_THROW(StateDirectory(scratch.path("file")), StartError);
}

TEST_F(StateDirectories, BelongToOneHostAtATime) {
    std::optional<StateDirectory> first(scratch.path("state"));
    try {
        const StateDirectory second(scratch.path("state"));
        FAIL() << "two hosts have it";
    } catch (const StartError& error) {
        EXPECT_NE(std::string(error.what()).find("is in use by"), std::string::npos);
    }
    first.reset();
    EXPECT_NO_THROW(StateDirectory(scratch.path("state")));
}

TEST_F(StateDirectories, KnowHowTheLastHostEnded) {
    EXPECT_TRUE(StateDirectory(scratch.path("state")).endedCleanly()) << "there was none";
    scratch.write("state/journal.db", "");
    EXPECT_FALSE(StateDirectory(scratch.path("state")).endedCleanly());
    StateDirectory(scratch.path("state")).noteCleanEnd();
    EXPECT_TRUE(StateDirectory(scratch.path("state")).endedCleanly());
    EXPECT_FALSE(StateDirectory(scratch.path("state")).endedCleanly());
}

TEST_F(StateDirectories, GiveADamagedJournalANameOfItsOwn) {
    const StateDirectory state(scratch.path("state"));
    scratch.write("state/journal.db", "one");
    scratch.write("state/journal.db-wal", "log of one");
    for (const char* end : {"", "-wal"})
        ASSERT_EQ(::chmod(scratch.path(std::string("state/journal.db") + end).c_str(), 0644), 0);
    scratch.write("state/journal.db-shm", "index");
    const std::string first = state.setAside();
    scratch.write("state/journal.db", "two");
    const std::string second = state.setAside();
    EXPECT_NE(first, second);
    EXPECT_EQ(scratch.read("state/journal.db.damaged-1"), "one");
    EXPECT_EQ(scratch.read("state/journal.db.damaged-1-wal"), "log of one");
    EXPECT_EQ(scratch.read("state/journal.db.damaged-2"), "two");
    EXPECT_EQ(modeOf(first), 0600U) << "it may hold secrets";
    EXPECT_EQ(modeOf(first + "-wal"), 0600U);
    EXPECT_FALSE(scratch.exists("state/journal.db"));
    EXPECT_FALSE(scratch.exists("state/journal.db-shm"));
}

TEST_F(StateDirectories, RememberWhoseJournalTheyHold) {
    const StateDirectory state(scratch.path("state"));
    EXPECT_EQ(state.notedIdentity(), "");
    state.noteIdentity("a longer identity");
    state.noteIdentity("short");
    EXPECT_EQ(state.notedIdentity(), "short");
    EXPECT_EQ(modeOf(scratch.path("state/identity")), 0600U);
}

TEST_F(StateDirectories, KeepSomeSpaceInReserve) {
    const StateDirectory state(scratch.path("state"));
    ASSERT_TRUE(state.takeReserve());
    ASSERT_TRUE(state.takeReserve());
    struct stat found {};
    ASSERT_EQ(::stat(scratch.path("state/reserve").c_str(), &found), 0);
    EXPECT_GE(static_cast<long long>(found.st_blocks) * 512, StateDirectory::kReserve);
    state.freeReserve();
    EXPECT_FALSE(scratch.exists("state/reserve"));
}

}  // namespace
