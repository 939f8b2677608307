#include "ctl/verbs/host/status.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using nlohmann::json;

TEST(Status, ShowsAFigurePerLine) {
    const json health = {{"status", "ok"}, {"uptime", 12}, {"note", ""}};
    EXPECT_EQ(ctl::showStatus(health, Format::Text).out, "status  ok\nuptime  12\n");
}

TEST(Status, TellsHowLongTheHostHasBeenThere) {
    const json health = {{"guarded", true}, {"uptime_seconds", 7325}};
    EXPECT_EQ(ctl::showStatus(health, Format::Text).out, "guarded  true\nuptime   2 h\n");
    EXPECT_EQ(ctl::showStatus({{"uptime_seconds", "x"}}, Format::Text).out, "uptime_seconds  x\n");
}

TEST(Status, TellsWhyTheHostOnlySeemsToBeAlive) {
    const json hang = {{"part", "command"}, {"text", "it hangs"}};
    EXPECT_EQ(ctl::showStatus({{"alive", true}, {"reasons", json::array()}}, Format::Text).out,
              "alive  true\n");
    EXPECT_EQ(
        ctl::showStatus({{"alive", false}, {"reasons", {hang, hang, "odd"}}}, Format::Text).out,
        "alive    false\nreasons  it hangs; it hangs\n");
    EXPECT_EQ(ctl::showStatus({{"reasons", 5}, {"version", "1"}}, Format::Text).out,
              "version  1\n");
}

TEST(Status, IsTheHostsOwnDocumentAsJson) {
    const json health = {{"status", "ok"}, {"uptime", 12}, {"note", ""}};
    EXPECT_EQ(json::parse(ctl::showStatus(health, Format::Json).out), health);
}

}  // namespace
