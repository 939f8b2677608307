#include "host/process/log.h"

#include <gtest/gtest.h>

#include "support/scoped_env.h"

namespace {

using host::logLine;
using host::Priority;

TEST(Log, TheJournalGetsThePriorityAndOthersTheProgramsName) {
    EXPECT_EQ(logLine(Priority::Error, "no home", true), "<3>no home\n");
    EXPECT_EQ(logLine(Priority::Warning, "late", true), "<4>late\n");
    EXPECT_EQ(logLine(Priority::Info, "fine", true), "<6>fine\n");
    EXPECT_EQ(logLine(Priority::Error, "no home", false), "zavhost: no home\n");
}

TEST(Log, AnEventIsOneLine) {
    EXPECT_EQ(logLine(Priority::Error, "a\nb\r\nc", true), "<3>a b  c\n");
}

TEST(Log, NothingInALineSteersATerminal) {
    EXPECT_EQ(logLine(Priority::Info, "a\033[2Jb\007c\177d\te", false), "zavhost: a [2Jb c d e\n");
    EXPECT_EQ(logLine(Priority::Info, "gr\xC3\xBC\xC3\x9F", false),
              "zavhost: gr\xC3\xBC\xC3\x9F\n");
}

TEST(Log, OnlyTheStreamThatIsNamedIsTheJournals) {
    struct stat found {};
    ASSERT_EQ(::fstat(STDERR_FILENO, &found), 0);
    const std::string device = std::to_string(found.st_dev);
    const std::string inode = std::to_string(found.st_ino);
    const ScopedEnv stream("JOURNAL_STREAM", device + ":" + inode);
    EXPECT_TRUE(host::logsToJournal());
    stream.set((device + ":" + inode + "0").c_str());
    EXPECT_FALSE(host::logsToJournal());
    stream.set("");
    EXPECT_FALSE(host::logsToJournal());
    stream.set(nullptr);
    EXPECT_FALSE(host::logsToJournal());
}

}  // namespace
