#include "ctl/verbs/host/version.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using nlohmann::json;

TEST(Version, IsThatOfTheProgramWithoutAHost) {
    EXPECT_THAT(ctl::showVersion(nullptr, "/s", Format::Text).out,
                testing::MatchesRegex("zavctl [0-9.]+\n"));
    EXPECT_EQ(json::parse(ctl::showVersion(nullptr, "/s", Format::Json).out)["zavhost"], json());
}

TEST(Version, IsThatOfTheHostTooWhenItAnswers) {
    const json health = {{"version", "7.8.9"}};
    EXPECT_THAT(ctl::showVersion(health, "/s", Format::Text).out,
                testing::MatchesRegex("zavctl [0-9.]+\nzavhost 7.8.9 at /s\n"));
    EXPECT_EQ(json::parse(ctl::showVersion(health, "/s", Format::Json).out)["zavhost"], "7.8.9");
}

}  // namespace
