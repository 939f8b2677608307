// Fills the disk with the journal at random moments, and makes room again, while the host gets work
// in both ways; and compares afterwards what it said with what the tasks did.
//
//   ZAV_FULL_DISKS=1000 ZAV_FULL_DISK_SEED=17 build/native/bin/crash_threaded_tests
//
// Without these variables it does so three times, with a seed of its own, which is printed.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <iostream>
#include <random>
#include <thread>

#include "crash/killed_host.h"
#include "crash/variable_or.h"
#include "support/scratch_dir.h"
#include "support/small_filesystem.h"

namespace {

/// It is there before the host and after it.
struct Disk {
    /// For the journal, its log of changes, and what is kept in reserve.
    static constexpr unsigned kSizeKiB = 12 * 1024;

    ScratchDir scratch;
    const std::string path = scratch.makeDir("disk");
    const SmallFilesystem disk{path, kSizeKiB};
};

class FullDisks : protected Disk, public KilledHost {
protected:
    FullDisks() : KilledHost({}, {"--state", path + "/state"}) { mayBeFull = true; }

    void SetUp() override {
        if (!disk.mounted()) GTEST_SKIP() << "no filesystem can be mounted here: " << disk.reason();
    }

    /// Loads the host, fills the disk but for these bytes, and goes on loading it.
    void loadAndFill(int round, std::chrono::microseconds delay, off_t leaving) {
        loadAndDisturb(2 * round, delay, [this, leaving] { disk.fill(leaving); });
        loadAndDisturb(2 * round + 1, delay, [this] { disk.empty(); });
    }
    bool isReady() const { return get("/v1/ready")["ready"] == true; }
};

TEST_F(FullDisks, LoseNothingAndRunNothingThatWasRefused) {
    const unsigned rounds = variableOr("ZAV_FULL_DISKS", 3);
    const unsigned seed = variableOr("ZAV_FULL_DISK_SEED", std::random_device()());
    std::cout << rounds << " full disks with the seed " << seed << std::endl;
    std::mt19937 random(seed);
    std::uniform_int_distribution<int> delays(0, 300'000);
    std::uniform_int_distribution<off_t> leavings(0, 8);
    for (unsigned round = 0; round < rounds; ++round) {
        loadAndFill(static_cast<int>(round), std::chrono::microseconds(delays(random)),
                    leavings(random) * 4096);
        // A room is made only for who asks.
        ASSERT_TRUE(eventually([this] { return isReady(); }));
    }
    ASSERT_TRUE(eventually([this] { return isIdle(); }, std::chrono::minutes(1 + rounds)));
    std::cout << accepted.size() << " accepted, " << refused.size() << " refused" << std::endl;
    EXPECT_THAT(faults(), testing::IsEmpty());
    EXPECT_EQ(get("/v1/tasks?state=interrupted")["tasks"].size(), 0U);
    EXPECT_EQ(askInTurn("j999999"), true) << "there is room again";
}

TEST_F(FullDisks, AreSeenByWhoAsks) {
    EXPECT_EQ(askInTurn("j1"), true);
    ASSERT_TRUE(eventually([this] { return isIdle(); }));
    disk.fill();
    int number = 1;
    EXPECT_TRUE(eventually([&] { return askInTurn("j" + std::to_string(++number)) == false; }))
        << "the disk is full and everything is accepted";
    disk.empty();
    EXPECT_TRUE(eventually([&] { return askInTurn("j" + std::to_string(++number)) == true; }));
    ASSERT_TRUE(eventually([this] { return isIdle(); }));
}

/// Nobody has made room when it starts again: what was accepted can be asked for all the same.
TEST_F(FullDisks, AreStillFullAfterAKill) {
    EXPECT_EQ(askInTurn("j1"), true);
    ASSERT_TRUE(eventually([this] { return isIdle(); }));
    host->program().signal(SIGKILL);
    EXPECT_EQ(host->program().wait().status, 128 + SIGKILL);
    disk.fill();
    host->start();
    EXPECT_EQ(get("/v1/tasks/j1")["state"], "done");
    disk.empty();
    EXPECT_TRUE(eventually([this] { return isReady(); }));
    EXPECT_EQ(askInTurn("j2"), true);
    ASSERT_TRUE(eventually([this] { return isIdle(); }));
}

}  // namespace
