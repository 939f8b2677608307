#include "host/process/children/process_table.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>

#include "support/host/program.h"

namespace {

using host::ProcessEntry;
using host::processIn;
using host::readProcesses;

const char* const kStat =
    "4711 (a (b) c) S 1 20 30 0 -1 4194304 1 2 3 4 5 6 7 8 20 0 1 0 123456 1000 100\n";

TEST(ProcessTable, ReadsAnEntryWhateverTheProgramsName) {
    const auto process = processIn(kStat);
    ASSERT_TRUE(process);
    EXPECT_EQ(process->pid, 4711);
    EXPECT_EQ(process->parent, 1);
    EXPECT_EQ(process->session, 30);
    EXPECT_EQ(process->start, 123456U);
    EXPECT_TRUE(process->isAlive);
    EXPECT_FALSE(processIn("12 (x) Z 1 2 3 0 -1 0 1 2 3 4 5 6 7 8 20 0 1 0 99 0")->isAlive);
}

TEST(ProcessTable, TakesNoOtherText) {
    for (const char* text : {"", "4711", "4711 (name", "4711 (name) S 1 20 30", "(name) S 1 2 3"})
        EXPECT_FALSE(processIn(text)) << text;
}

TEST(ProcessTable, ListsThisProcessAndItsChild) {
    Program child({"/bin/sh", "-c", "echo runs; exec sleep 1000"});
    ASSERT_TRUE(child.awaitOutput("runs", std::chrono::seconds(20)));
    const std::vector<ProcessEntry> processes = readProcesses();
    const auto entryOf = [&](pid_t pid) {
        return std::find_if(processes.begin(), processes.end(),
                            [pid](const ProcessEntry& entry) { return entry.pid == pid; });
    };
    ASSERT_NE(entryOf(::getpid()), processes.end());
    ASSERT_NE(entryOf(child.pid()), processes.end());
    EXPECT_EQ(entryOf(child.pid())->parent, ::getpid());
    EXPECT_GE(entryOf(child.pid())->start, entryOf(::getpid())->start);
}

TEST(ProcessTable, CountsChildrenThatLive) {
    const std::size_t before = host::countLivingChildren();
    Program sleeper({"/bin/sleep", "1000"});
    EXPECT_EQ(host::countLivingChildren(), before + 1);
    sleeper.signal(SIGKILL);
    sleeper.wait();
    EXPECT_EQ(host::countLivingChildren(), before);
}

}  // namespace
