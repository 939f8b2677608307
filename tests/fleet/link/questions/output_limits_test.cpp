/// How much output a host shows, how fast, and for how long. The tests' clock is a number.
#include <gtest/gtest.h>

#include <string>

#include "fleet/link/questions/output_leases.h"
#include "fleet/link/questions/output_rate.h"

namespace {

using fleet::Moment;
using fleet::OutputLeases;
using fleet::OutputRate;
using std::chrono::seconds;

constexpr Moment kBegun{1'000'000};

TEST(OutputThatIsShown, EndsThirtySecondsAfterTheLastQuestion) {
    OutputLeases leases;
    ASSERT_TRUE(leases.begin("a", kBegun));
    EXPECT_TRUE(leases.isWanted("a", kBegun + seconds(30) - Moment(1)));
    EXPECT_FALSE(leases.isWanted("a", kBegun + seconds(30)));
    EXPECT_TRUE(leases.renew("a", kBegun + seconds(10)));
    EXPECT_TRUE(leases.isWanted("a", kBegun + seconds(40) - Moment(1)));
    EXPECT_FALSE(leases.isWanted("a", kBegun + seconds(40)));
    EXPECT_FALSE(leases.renew("a", kBegun + seconds(40))) << "it is over";
    EXPECT_FALSE(leases.renew("b", kBegun)) << "there is none such";
}

TEST(OutputThatIsShown, IsOfFourTasksAtATime) {
    OutputLeases leases;
    for (const char* const stream : {"a", "b", "c", "d"})
        ASSERT_TRUE(leases.begin(stream, kBegun));
    EXPECT_FALSE(leases.begin("e", kBegun + seconds(29)));
    leases.end("b");
    EXPECT_TRUE(leases.begin("e", kBegun + seconds(29)));
    EXPECT_FALSE(leases.begin("f", kBegun + seconds(29)));
    EXPECT_TRUE(leases.begin("f", kBegun + seconds(30))) << "nobody wants the first ones any more";
}

TEST(OutputThatIsShown, IsNoFasterThanTheLimit) {
    OutputRate rate;
    Moment now = kBegun;
    std::size_t sent = 0;
    while (now < kBegun + seconds(10)) {
        now += rate.pauseBefore(10'000, now);
        if (now < kBegun + seconds(10)) sent += 10'000;
    }
    EXPECT_LE(sent, 10 * OutputRate::kBytesPerSecond + 10'000);
    EXPECT_GE(sent, 9 * OutputRate::kBytesPerSecond) << "and not much slower";
}

TEST(OutputThatIsShown, SharesTheLimitAmongAllStreams) {
    OutputRate rate;
    EXPECT_EQ(rate.pauseBefore(OutputRate::kBytesPerSecond, kBegun), Moment(0));
    EXPECT_EQ(rate.pauseBefore(OutputRate::kBytesPerSecond, kBegun), Moment(seconds(1)));
    EXPECT_EQ(rate.pauseBefore(1, kBegun), Moment(seconds(2)));
    EXPECT_EQ(rate.pauseBefore(1, kBegun + seconds(10)), Moment(0)) << "a pause saves nothing up";
}

TEST(OutputThatIsShown, HasALimitOfMessagesToo) {
    OutputRate rate;
    Moment now = kBegun;
    for (int i = 0; i < 256; ++i)
        now += rate.pauseBefore(1, now);
    EXPECT_GE(now - kBegun, Moment(990));
}

}  // namespace
