// Kills the host at random moments while it gets work in both ways, and compares afterwards what
// the journal says with what the tasks themselves wrote down.
//
//   ZAV_CRASH_KILLS=1000 ZAV_CRASH_SEED=17 build/native/bin/crash_threaded_tests
//
// Without these variables it kills three times, with a seed of its own, which is printed.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <iostream>
#include <random>

#include "crash/killed_host.h"
#include "crash/variable_or.h"

namespace {

class RandomKills : public KilledHost {};

TEST_F(RandomKills, LoseNothingAndRepeatNothing) {
    const unsigned kills = variableOr("ZAV_CRASH_KILLS", 3);
    const unsigned seed = variableOr("ZAV_CRASH_SEED", std::random_device()());
    std::cout << kills << " kills with the seed " << seed << std::endl;
    std::mt19937 random(seed);
    std::uniform_int_distribution<int> delays(0, 300'000);
    for (unsigned round = 0; round < kills; ++round)
        loadAndKill(static_cast<int>(round), std::chrono::microseconds(delays(random)));
    ASSERT_TRUE(eventually([this] { return isIdle(); }, std::chrono::minutes(1 + kills)));
    EXPECT_THAT(faults(), testing::IsEmpty());
}

TEST_F(RandomKills, NoStopMattersEither) {
    const unsigned stops = variableOr("ZAV_CRASH_KILLS", 3);
    const unsigned seed = variableOr("ZAV_CRASH_SEED", std::random_device()());
    std::cout << stops << " stops with the seed " << seed << std::endl;
    std::mt19937 random(seed);
    std::uniform_int_distribution<int> delays(0, 300'000);
    for (unsigned round = 0; round < stops; ++round) {
        loadAndStop(static_cast<int>(round), std::chrono::microseconds(delays(random)),
                    std::chrono::microseconds(delays(random)));
    }
    ASSERT_TRUE(eventually([this] { return isIdle(); }, std::chrono::minutes(1 + stops)));
    EXPECT_THAT(faults(), testing::IsEmpty());
    EXPECT_EQ(accepted.size(), 2U * stops * kTasksPerRound);
    EXPECT_EQ(get("/v1/tasks?state=interrupted")["tasks"].size(), 0U);
}

}  // namespace
