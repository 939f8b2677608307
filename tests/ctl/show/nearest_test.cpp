#include "ctl/show/nearest.h"

#include <gtest/gtest.h>

namespace {

using ctl::nearestWord;

const std::vector<std::string> kKnown = {"start", "stop", "status", "agents", "config get"};

TEST(Nearest, FindsWhatWasMeantByASlip) {
    EXPECT_EQ(nearestWord("agnets", kKnown), "agents");
    EXPECT_EQ(nearestWord("agent", kKnown), "agents");
    EXPECT_EQ(nearestWord("sttop", kKnown), "stop");
    EXPECT_EQ(nearestWord("stat", kKnown), "start");
    EXPECT_EQ(nearestWord("config gte", kKnown), "config get");
    EXPECT_EQ(nearestWord("start", kKnown), "start");
}

TEST(Nearest, FindsNothingForAnotherWord) {
    for (const char* word : {"", "x", "frobnicate", "install", "AGENTS"})
        EXPECT_EQ(nearestWord(word, kKnown), "") << word;
    EXPECT_EQ(nearestWord(std::string(100000, 's'), kKnown), "");
    EXPECT_EQ(nearestWord("start", {}), "");
}

TEST(Nearest, IsSuggestedAsAQuestion) {
    EXPECT_EQ(ctl::suggestion("agnets", kKnown), "; did you mean \"agents\"?");
    EXPECT_EQ(ctl::suggestion("frobnicate", kKnown), "");
}

}  // namespace
