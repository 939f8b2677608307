#include "ctl/client/row.h"

#include <gtest/gtest.h>

#include <cstdint>
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

TEST(Row, TakesAMissingColumnForEmpty) {
    EXPECT_EQ(ctl::textOf(json::object(), "NOPE"), "");
    EXPECT_EQ(ctl::textOf(json(), "NOPE"), "");
}

TEST(Row, TakesAReturnCodeThatIsNoneForNoSuccess) {
    EXPECT_EQ(ctl::returnCodeOf(json::object()), ctl::kNoReturnCode);
    EXPECT_EQ(ctl::returnCodeOf(json::array({1})), ctl::kNoReturnCode);
    for (const json& value : {json("x"), json(nullptr), json(0.0), json(true), json(4294967296),
                              json(18446744073709551615ULL)}) {
        EXPECT_EQ(ctl::returnCodeOf(json{{"RETVAL", value}}), ctl::kNoReturnCode) << value;
    }
    EXPECT_EQ(ctl::returnCodeOf(json{{"RETVAL", -2147483648LL}}), -2147483647 - 1);
}

TEST(Row, GivesAnObjectWithBytesThatAreNoTextAsMendedJson) {
    EXPECT_EQ(ctl::valueText(json{{"A", "\xff"}}), "{\"A\":\"\xef\xbf\xbd\"}");
}

TEST(Row, TakesMembersOfAnotherTypeForMissingOnes) {
    const json row = {{"YES", true}, {"SIZE", 7}, {"WORD", "x"}, {"LESS", -1}};
    EXPECT_TRUE(ctl::flagOf(row, "YES", false));
    EXPECT_TRUE(ctl::flagOf(row, "WORD", true));
    EXPECT_FALSE(ctl::flagOf(json::array({1}), "YES", false));
    EXPECT_EQ(ctl::countOf(row, "SIZE"), 7U);
    for (const char* member : {"WORD", "LESS", "NONE"})
        EXPECT_EQ(ctl::countOf(row, member), 0U) << member;
    EXPECT_EQ(ctl::countOf(json(7), "SIZE"), 0U);
}

TEST(Row, KnowsWhichNumbersAreInARange) {
    const json row = {{"A", 7}, {"MANY", 18446744073709551615ULL}, {"LESS", -1}, {"HALF", 7.0}};
    EXPECT_TRUE(ctl::isBetween(row, "A", 7, 7));
    EXPECT_FALSE(ctl::isBetween(row, "A", 8, 9));
    EXPECT_FALSE(ctl::isBetween(row, "A", 0, 6));
    EXPECT_TRUE(ctl::isBetween(row, "LESS", -1, 0));
    for (const char* member : {"MANY", "HALF", "NONE"})
        EXPECT_FALSE(ctl::isBetween(row, member, INT64_MIN, INT64_MAX)) << member;
    EXPECT_FALSE(ctl::isBetween(json::array({7}), "A", 0, 9));
}

}  // namespace
