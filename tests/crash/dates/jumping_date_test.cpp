// Kills the host at random moments while its date jumps to and fro.
//
//   ZAV_CRASH_KILLS=1000 ZAV_CRASH_SEED=17 build/native/bin/crash_dates_threaded_tests
//
// Without these variables it kills three times, with a seed of its own, which is printed.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <iostream>
#include <random>
#include <set>
#include <string>

#include "crash/killed_host.h"
#include "crash/variable_or.h"

namespace {

class JumpingDate : public KilledHost {
protected:
    JumpingDate() : KilledHost({{"LD_PRELOAD", ZAV_BUILD_DIR "/lib/libzav_jumping_date.so"}}) {}

    /// The days on which tasks were accepted, as the host's date was then.
    std::set<std::string> days() const {
        std::set<std::string> days;
        std::vector<std::string> twice;
        for (const auto& [name, task] : allTasks(twice))
            days.insert(std::string(task["accepted"]).substr(0, 10));
        return days;
    }
};

TEST_F(JumpingDate, AndKillsLoseNothingAndRepeatNothing) {
    const unsigned kills = variableOr("ZAV_CRASH_KILLS", 3);
    const unsigned seed = variableOr("ZAV_CRASH_SEED", std::random_device()());
    std::cout << kills << " kills with the seed " << seed << std::endl;
    std::mt19937 random(seed);
    std::uniform_int_distribution<int> delays(0, 300'000);
    for (unsigned round = 0; round < kills; ++round)
        loadAndKill(static_cast<int>(round), std::chrono::microseconds(delays(random)));
    ASSERT_TRUE(eventually([this] { return isIdle(); }, std::chrono::minutes(1 + kills)));
    EXPECT_THAT(faults(), testing::IsEmpty());
    int more = 900;
    EXPECT_TRUE(eventually([&] {
        askInTurn("j" + std::to_string(more++));
        return days().size() >= 2;
    })) << "the date does not jump";
}

}  // namespace
