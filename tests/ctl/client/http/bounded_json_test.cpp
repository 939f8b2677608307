#include "ctl/client/http/bounded_json.h"

#include <gtest/gtest.h>

namespace {

using ctl::parseBounded;
using nlohmann::json;

std::string nested(std::size_t levels) {
    return std::string(levels, '[') + std::string(levels, ']');
}

TEST(BoundedJson, IsTheDocument) {
    const ctl::ParsedJson parsed = parseBounded(R"({"A": [1, "x"]})");
    EXPECT_EQ(parsed.fault, nullptr);
    EXPECT_EQ(parsed.document, (json{{"A", {1, "x"}}}));
}

TEST(BoundedJson, TakesAHundredLevels) {
    EXPECT_EQ(parseBounded(nested(100)).fault, nullptr);
    EXPECT_STREQ(parseBounded(nested(101)).fault, "is nested deeper than 100 levels");
    EXPECT_STREQ(parseBounded(std::string(200'000, '[')).fault, "is nested deeper than 100 levels");
}

TEST(BoundedJson, CountsNoBracketsInsideText) {
    const std::string text = "\\\\\\\"" + std::string(200, '[');
    EXPECT_EQ(parseBounded("[\"" + text + "\"]").fault, nullptr);
}

TEST(BoundedJson, TakesAMillionRows) {
    std::string rows = "[";
    for (int i = 0; i < 1'000'101; ++i)
        rows += "{},";
    rows.back() = ']';
    EXPECT_STREQ(parseBounded(rows).fault, "has more than 1,000,000 rows");
}

TEST(BoundedJson, TakesAMillionCommas) {
    std::string numbers = "[0";
    for (int i = 0; i < 1'000'000; ++i)
        numbers += ",0";
    EXPECT_EQ(parseBounded(numbers + "]").document.size(), 1'000'001U);
    EXPECT_STREQ(parseBounded(numbers + ",0]").fault, "has more than 1,000,000 members");
}

TEST(BoundedJson, CountsTheMembersOfOneObject) {
    std::string object = "{\"m\":0";
    for (int i = 0; i <= 1'000'000; ++i)
        object += ",\"" + std::to_string(i) + "\":0";
    EXPECT_STREQ(parseBounded(object + "}").fault, "has more than 1,000,000 members");
}

TEST(BoundedJson, CountsNoCommasInsideText) {
    EXPECT_EQ(parseBounded("[\"" + std::string(1'000'001, ',') + "\"]").fault, nullptr);
}

TEST(BoundedJson, ThatIsNoneIsNull) {
    for (const char* text : {"", "<html>", "{", "[1]]"}) {
        EXPECT_STREQ(parseBounded(text).fault, "is no JSON") << text;
        EXPECT_TRUE(parseBounded(text).document.is_null()) << text;
    }
}

TEST(BoundedJson, IsTakenForAnObjectOnlyIfItIsOne) {
    EXPECT_EQ(ctl::objectIn(R"({"A": 1})"), (json{{"A", 1}}));
    for (const char* text : {"[]", "1", "no"})
        EXPECT_TRUE(ctl::objectIn(text).is_null()) << text;
}

}  // namespace
