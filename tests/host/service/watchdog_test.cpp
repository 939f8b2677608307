#include "host/service/watchdog.h"

#include <gtest/gtest.h>

namespace {

using host::Pulse;
using std::chrono::seconds;

const Pulse::Time kNow{std::chrono::hours(1)};

TEST(Watchdog, AHostThatDoesNothingIsAlive) {
    EXPECT_TRUE(host::isAlive({}, kNow));
}

TEST(Watchdog, ACommandMayOutliveItsTimeByAMinute) {
    EXPECT_TRUE(host::isAlive({kNow + seconds(300), {}}, kNow));
    EXPECT_TRUE(host::isAlive({kNow - seconds(60), {}}, kNow));
    EXPECT_FALSE(host::isAlive({kNow - seconds(61), {}}, kNow));
}

TEST(Watchdog, ACommitMayHangForAMinute) {
    EXPECT_TRUE(host::isAlive({{}, kNow}, kNow));
    EXPECT_TRUE(host::isAlive({{}, kNow - seconds(60)}, kNow));
    EXPECT_FALSE(host::isAlive({{}, kNow - seconds(61)}, kNow));
}

TEST(Watchdog, EitherIsEnough) {
    EXPECT_FALSE(host::isAlive({kNow + seconds(300), kNow - seconds(61)}, kNow));
    EXPECT_FALSE(host::isAlive({kNow - seconds(61), kNow}, kNow));
}

}  // namespace
