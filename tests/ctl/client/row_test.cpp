#include "ctl/client/row.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using nlohmann::json;

TEST(Row, GivesTextsAndTheReturnCode) {
    const json row = {{"RETVAL", 1024}, {"RETMSGID", "ZAV1024E"}, {"COUNT", 3}, {"NONE", nullptr}};
    EXPECT_EQ(ctl::returnCodeOf(row), 1024);
    EXPECT_EQ(ctl::textOf(row, "RETMSGID"), "ZAV1024E");
    EXPECT_EQ(ctl::textOf(row, "COUNT"), "3");
    EXPECT_EQ(ctl::textOf(row, "NONE"), "");
}

TEST(Row, TakesAMissingColumnForEmptyAndAMissingReturnCodeForSuccess) {
    EXPECT_EQ(ctl::textOf(json::object(), "NOPE"), "");
    EXPECT_EQ(ctl::returnCodeOf(json::object()), 0);
    EXPECT_EQ(ctl::returnCodeOf(json{{"RETVAL", "x"}}), 0);
}

TEST(Row, GivesAnObjectWithBytesThatAreNoTextAsMendedJson) {
    EXPECT_EQ(ctl::valueText(json{{"A", "\xff"}}), "{\"A\":\"\xef\xbf\xbd\"}");
}

}  // namespace
