#include "ctl/verbs/config/config_edit.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using nlohmann::json;

TEST(ConfigEdit, SaysThatNothingChanged) {
    const json row = {{"RETVAL", 0}, {"CONTEXT", "A=1"}};
    EXPECT_EQ(ctl::showUnchanged("ux", row, Format::Text).out, "config edit ux: nothing changed\n");
    EXPECT_EQ(json::parse(ctl::showUnchanged("ux", row, Format::Json).out),
              (json{{"reply", row}, {"events", json::array()}}));
}

}  // namespace
