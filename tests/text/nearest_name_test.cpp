#include "text/nearest_name.h"

#include <gtest/gtest.h>

namespace {

using text::nearestName;

const std::vector<std::string> kNames = {"--home", "--socket", "--rpc-socket", "--plugin"};

TEST(NearestName, ForgivesOneSlipOfEachKind) {
    for (const char* slip : {"--hone", "--hme", "--homme", "--ohme", "--HOME"}) {
        EXPECT_EQ(nearestName(slip, kNames), "--home") << slip;
    }
}

TEST(NearestName, ForgivesMoreInALongName) {
    EXPECT_EQ(nearestName("--rcp-soket", kNames), "--rpc-socket");
    EXPECT_EQ(nearestName("ux", {"um", "ne"}), "um");
    EXPECT_EQ(nearestName("ux", {"ne"}), "");
}

TEST(NearestName, SaysNothingWhenNothingIsClose) {
    EXPECT_EQ(nearestName("--verbose", kNames), "");
    EXPECT_EQ(nearestName("", kNames), "");
    EXPECT_EQ(nearestName("--home", {}), "");
}

TEST(NearestName, PrefersTheClosestAndThenTheFirst) {
    EXPECT_EQ(nearestName("abcd", {"abxx", "abcx", "abcy"}), "abcx");
}

TEST(NearestName, DoesNotLookAtTextThatIsTooLongForAName) {
    const std::string text(100'000, 'x');
    EXPECT_EQ(nearestName(text, {text}), "");
}

}  // namespace
