#include "ctl/show/message_catalogue.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <nlohmann/json.hpp>
#include <set>

#include "tasks/return_codes.h"

namespace {

TEST(MessageCatalogue, HasATextForEveryReturnCodeOfThePlugin) {
    ASSERT_STREQ(rc2MsgId[0], "") << "success needs no text";
    std::set<std::string> texts;
    const auto count = static_cast<std::size_t>(std::end(rc2MsgId) - std::begin(rc2MsgId));
    for (std::size_t code = 1; code < count; ++code) {
        const std::string text = ctl::messageText(rc2MsgId[code]);
        EXPECT_NE(text, "") << rc2MsgId[code];
        EXPECT_TRUE(texts.insert(text).second) << rc2MsgId[code] << " shares its text";
    }
}

TEST(MessageCatalogue, HasNoTextForAnUnknownIdentifier) {
    for (const char* id : {"", "ZAV1036E", "ZAV1001I", "zav1001E"})
        EXPECT_EQ(ctl::messageText(id), "") << id;
}

TEST(MessageCatalogue, DescribesAResultWithItsParameter) {
    EXPECT_EQ(ctl::describeResult(1006, "ZAV1006E", "JUMP"),
              "ZAV1006E: the command is not supported [JUMP]");
    EXPECT_EQ(ctl::describeResult(1002, "ZAV1002E", ""),
              "ZAV1002E: the request has no transaction identifier");
    EXPECT_EQ(ctl::describeResult(1031, "", ""), "return code 1031");
    EXPECT_EQ(ctl::describeResult(1031, "ZAV9999E", "a\x1b"), "ZAV9999E [a\\x1B]");
    EXPECT_EQ(ctl::describeResult(1031, "ZAV9999E", "x,token=y"), "ZAV9999E [x,token=***]");
}

TEST(MessageCatalogue, DescribesARow) {
    EXPECT_EQ(
        ctl::describeRow({{"RETVAL", 1006}, {"RETMSGID", "ZAV1006E"}, {"RETMSGPARM", "JUMP"}}),
        "ZAV1006E: the command is not supported [JUMP]");
    EXPECT_EQ(ctl::describeRow({{"RETVAL", 7}}), "return code 7");
}

}  // namespace
