// An agent's log: its size, and what may stand in its place.
#include <gmock/gmock.h>

#include <algorithm>

#include "home/home_fixture.h"

using ::testing::HasSubstr;

namespace {

constexpr std::size_t kLimit = 16 * 1024;

class AgentLog : public PreparedHomeTest {
protected:
    /// An agent with a log of 16 KiB.
    void addTalker(const std::string& body) const {
        addAgent("tt", body + "echo done\nexec sleep 600\n",
                 "START_SECONDS=0\nSTOP_SECONDS=1\nLOG_KB=16\n");
    }
    bool logged(const std::string& text) const {
        return eventually([&] { return read("logs/tt.log").find(text) != std::string::npos; });
    }
    std::uintmax_t size(const std::string& file) const {
        return std::filesystem::file_size(inHome(file));
    }
    void TearDown() override {
        agent({"stop", "tt"});
        PreparedHomeTest::TearDown();
    }
};

TEST_F(AgentLog, NeverGrowsBeyondItsSizeAndThreeOlderOnesAreKept) {
    addTalker("head -c 200000 /dev/zero | tr '\\0' x\n");
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    ASSERT_TRUE(logged("done\n"));
    EXPECT_LE(size("logs/tt.log"), kLimit);
    for (const char* older : {"logs/tt.log.1", "logs/tt.log.2", "logs/tt.log.3"}) {
        ASSERT_TRUE(exists(older)) << older;
        EXPECT_EQ(size(older), kLimit) << older;
    }
    EXPECT_FALSE(exists("logs/tt.log.4"));
}

TEST_F(AgentLog, LosesNothingWhenItIsRotated) {
    addTalker("i=0; while [ $i -lt 5000 ]; do echo line $i; i=$((i + 1)); done\n");
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    ASSERT_TRUE(logged("done\n"));
    std::string all;
    for (const char* part : {".3", ".2", ".1", ""})
        all += read("logs/tt.log" + std::string(part));
    std::string expected;
    for (int i = 0; i < 5000; ++i)
        expected += "line " + std::to_string(i) + "\n";
    EXPECT_EQ(all, expected + "done\n");
    EXPECT_GT(all.size(), 2 * kLimit) << "it was rotated";
}

TEST_F(AgentLog, GoesOnWithWhatIsThere) {
    addTalker("");
    write("logs/tt.log", "before\n", 0600);
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    ASSERT_TRUE(logged("done\n"));
    EXPECT_EQ(read("logs/tt.log"), "before\ndone\n");
}

TEST_F(AgentLog, HoldsTheLastWordsOfAnAgentOnceItIsStopped) {
    addAgent("tt", "trap 'echo last words; exit 0' TERM\necho up\nwhile :; do sleep 0.1; done\n",
             "START_SECONDS=0\nSTOP_SECONDS=20\n");
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    ASSERT_TRUE(logged("up\n"));
    ASSERT_EQ(agent({"stop", "tt"}).status, 0);
    EXPECT_THAT(read("logs/tt.log"), HasSubstr("last words\n"));
}

TEST_F(AgentLog, ThatCannotBeWrittenAnyMoreDoesNotHoldUpTheAgent) {
    const std::string mark = scratch.path("through");
    addTalker("read -r go <" + inHome("tmp/go") + "\nhead -c 1000000 /dev/zero\ntouch " + mark +
              "\n");
    ASSERT_EQ(run({"/usr/bin/mkfifo", inHome("tmp/go")}).status, 0);
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    // A folder of that name: no user may write to it, not even root.
    std::filesystem::remove(inHome("logs/tt.log"));
    std::filesystem::create_directory(inHome("logs/tt.log"));
    std::ofstream(inHome("tmp/go")) << "go\n";
    EXPECT_TRUE(eventually([&] { return scratch.exists("through"); }));
    std::filesystem::remove(inHome("logs/tt.log"));
}

TEST_F(AgentLog, KeeperDropsWhatAFullDiskDoesNotTake) {
    const std::string log = scratch.path("full.log");
    const Outcome kept = run({"/bin/sh", "-c",
                              "trap '' XFSZ; ulimit -f 8\n"  // blocks of 512 bytes
                              "head -c 1000000 /dev/zero | sh \"$1\" \"$2\" 10240; echo $?",
                              "sh", inHome("lib/keep-log"), log});
    EXPECT_EQ(kept.out, "0\n") << kept.err;
    EXPECT_LE(std::filesystem::file_size(log), 4096U);
}

TEST_F(AgentLog, LinkOrFifoInItsPlaceIsRefused) {
    addTalker("");
    scratch.write("canary", "safe\n");
    std::filesystem::create_symlink(scratch.path("canary"), inHome("logs/tt.log"));
    EXPECT_EQ(agent({"start", "tt"}).status, 8);
    std::filesystem::remove(inHome("logs/tt.log"));
    ASSERT_EQ(run({"/usr/bin/mkfifo", inHome("logs/tt.log")}).status, 0);
    EXPECT_EQ(agent({"start", "tt"}).status, 8);
    EXPECT_EQ(scratch.read("canary"), "safe\n");
}

TEST_F(AgentLog, LinkThatIsPutInItsPlaceLaterIsNotFollowed) {
    addTalker("read -r go <" + inHome("tmp/go") + "\nhead -c 100000 /dev/zero\n");
    ASSERT_EQ(run({"/usr/bin/mkfifo", inHome("tmp/go")}).status, 0);
    scratch.write("canary", "safe\n");
    write("logs/tt.log", std::string(kLimit, 'x'), 0600);
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    std::filesystem::remove(inHome("logs/tt.log"));
    std::filesystem::create_symlink(scratch.path("canary"), inHome("logs/tt.log"));
    std::ofstream(inHome("tmp/go")) << "go\n";
    ASSERT_EQ(agent({"stop", "tt"}).status, 0);
    EXPECT_EQ(scratch.read("canary"), "safe\n");
}

}  // namespace
