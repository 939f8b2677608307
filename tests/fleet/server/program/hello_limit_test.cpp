#include "fleet/server/program/hello_limit.h"

#include <gtest/gtest.h>

namespace {

using fleet::HelloLimit;
using std::chrono::milliseconds;
using std::chrono::seconds;

const HelloLimit::Clock::time_point kStart{};

TEST(HelloLimit, AHostThatSaysItEveryTwoSecondsIsAlwaysHeard) {
    HelloLimit limit;
    for (int i = 0; i < 1'000; ++i)
        EXPECT_TRUE(limit.admits("a", kStart + seconds(2 * i)));
}

TEST(HelloLimit, AFloodIsHeardOnceASecond) {
    HelloLimit limit;
    int heard = 0;
    for (int i = 0; i < 10'000; ++i)
        heard += limit.admits("a", kStart + milliseconds(i)) ? 1 : 0;
    EXPECT_EQ(heard, HelloLimit::kBurst + 9);
}

TEST(HelloLimit, OthersAreHeardAllTheSame) {
    HelloLimit limit;
    for (int i = 0; i < 100; ++i)
        limit.admits("a", kStart);
    EXPECT_FALSE(limit.admits("a", kStart));
    EXPECT_TRUE(limit.admits("b", kStart));
}

TEST(HelloLimit, WhoWasSilentMayNotSaveItUp) {
    HelloLimit limit;
    EXPECT_TRUE(limit.admits("a", kStart));
    int heard = 0;
    for (int i = 0; i < 100; ++i)
        heard += limit.admits("a", kStart + std::chrono::hours(1)) ? 1 : 0;
    EXPECT_EQ(heard, HelloLimit::kBurst);
}

}  // namespace
