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
