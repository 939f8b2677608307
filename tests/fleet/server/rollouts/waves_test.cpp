#include "fleet/server/rollouts/waves.h"

#include <gtest/gtest.h>

#include <string>

#include "fleet/server/rollouts/rollout_error.h"
#include "fleet/server/rollouts/share.h"

namespace {

using fleet::RolloutError;
using fleet::Share;
using fleet::wavesOf;
using Waves = std::vector<std::size_t>;

TEST(Waves, AreCumulative) {
    EXPECT_EQ(wavesOf("1,10%,50%,100%", 200), (Waves{1, 20, 100, 200}));
    EXPECT_EQ(wavesOf("100%", 7), (Waves{7}));
}

TEST(Waves, RoundPercentagesUp) {
    EXPECT_EQ(wavesOf("1%,34%,100%", 3), (Waves{1, 2, 3}));
    EXPECT_EQ(wavesOf("10%,100%", 11), (Waves{2, 11}));
    EXPECT_EQ(wavesOf("10%,100%", 10), (Waves{1, 10}));
}

TEST(Waves, WithoutAnotherHostAreLeftOut) {
    EXPECT_EQ(wavesOf("1,10%,50%,100%", 3), (Waves{1, 2, 3}));
    EXPECT_EQ(wavesOf("1,10%,50%,100%", 1), (Waves{1}));
    EXPECT_EQ(wavesOf("50,10%,100%", 100), (Waves{50, 100}));
}

TEST(Waves, ReachNoMoreThanAllHosts) {
    EXPECT_EQ(wavesOf("5,20", 10), (Waves{5, 10}));
    EXPECT_EQ(wavesOf("5,20,30", 3), (Waves{3}));
}

TEST(Waves, EndWithTheRest) {
    EXPECT_EQ(wavesOf("1,5", 9), (Waves{1, 5, 9}));
    EXPECT_EQ(wavesOf("50%", 9), (Waves{5, 9}));
}

class WrongWaves : public testing::TestWithParam<const char*> {};

TEST_P(WrongWaves, AreRefused) {
    EXPECT_THROW(wavesOf(GetParam(), 10), RolloutError);
}

INSTANTIATE_TEST_SUITE_P(Texts, WrongWaves,
                         testing::Values("", ",", "1,", ",1", "1,,2", "0", "0%", "1,0", "101%",
                                         "2,1", "1,1", "50%,10%", "10%,10%", "2,50%,1", "100%,100%",
                                         " 1", "1 ", "1, 2", "+1", "-1", "1.5", "1%%", "%", "01",
                                         "0x10", "one", "99999999", "1;2"));

TEST(Waves, HaveALimit) {
    std::string text = "1";
    for (int i = 2; i <= 100; ++i)
        text += "," + std::to_string(i);
    EXPECT_EQ(wavesOf(text, 1'000).size(), 101U);
    EXPECT_THROW(wavesOf(text + ",101", 1'000), RolloutError);
}

TEST(Share, ThatMustNotBeExceededIsRoundedDown) {
    EXPECT_EQ(Share("2%").atMost(10), 0U);
    EXPECT_EQ(Share("2%").atMost(50), 1U);
    EXPECT_EQ(Share("2%").atMost(99), 1U);
    EXPECT_EQ(Share("100%").atMost(3), 3U);
    EXPECT_EQ(Share("0").atMost(3), 0U);
    EXPECT_EQ(Share("5").atMost(3), 5U);
}

}  // namespace
