#include "ctl/verbs/status.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using nlohmann::json;

TEST(Status, ShowsAFigurePerLine) {
    const json health = {{"status", "ok"}, {"uptime", 12}, {"note", ""}};
    EXPECT_EQ(ctl::showStatus(health, Format::Text).out, "status  ok\nuptime  12\n");
}

TEST(Status, IsTheHostsOwnDocumentAsJson) {
    const json health = {{"status", "ok"}, {"uptime", 12}, {"note", ""}};
    EXPECT_EQ(json::parse(ctl::showStatus(health, Format::Json).out), health);
}

}  // namespace
