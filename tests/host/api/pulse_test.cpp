#include "host/api/pulse.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using host::Pulse;
using std::chrono::seconds;
using Parts = std::vector<std::string>;

const Pulse::Time kNow{std::chrono::hours(1)};

Parts hanging(const Pulse& pulse) {
    Parts parts;
    for (const host::Hang& hang : host::hangsOf(pulse, kNow))
        parts.emplace_back(hang.part);
    return parts;
}

TEST(Pulses, AHostThatDoesNothingIsAlive) {
    EXPECT_EQ(hanging({}), Parts{});
}

TEST(Pulses, ACommandMayOutliveItsTimeByAMinute) {
    EXPECT_EQ(hanging({kNow + seconds(300), {}}), Parts{});
    EXPECT_EQ(hanging({kNow - seconds(60), {}}), Parts{});
    EXPECT_EQ(hanging({kNow - seconds(61), {}}), Parts{"command"});
}

TEST(Pulses, ACommitMayHangForAMinute) {
    EXPECT_EQ(hanging({{}, kNow}), Parts{});
    EXPECT_EQ(hanging({{}, kNow - seconds(60)}), Parts{});
    EXPECT_EQ(hanging({{}, kNow - seconds(61)}), Parts{"journal"});
}

TEST(Pulses, EitherIsEnough) {
    EXPECT_EQ(hanging({kNow + seconds(300), kNow - seconds(61)}), Parts{"journal"});
    EXPECT_EQ(hanging({kNow - seconds(61), kNow}), Parts{"command"});
    EXPECT_EQ(hanging({kNow - seconds(61), kNow - seconds(61)}), (Parts{"command", "journal"}));
}

}  // namespace
