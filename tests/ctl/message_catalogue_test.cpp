#include "ctl/show/message_catalogue.h"

#include <set>

namespace {

TEST(MessageCatalogue, HasATextOfItsOwnForEveryIdentifier) {
    std::set<std::string> texts;
    for (int code = 1001; code <= 1035; ++code) {
        const std::string id = "ZAV" + std::to_string(code) + (code == 1035 ? "I" : "E");
        EXPECT_FALSE(ctl::messageText(id).empty()) << id;
        texts.insert(ctl::messageText(id));
    }
    EXPECT_EQ(texts.size(), 35U);
    EXPECT_EQ(ctl::messageText("ZAV1036E"), "");
    EXPECT_EQ(ctl::messageText("ZAV1001I"), "");
}

TEST(MessageCatalogue, ShowsControlCharactersAsEscapes) {
    EXPECT_EQ(ctl::printable("cmd,\x03"), "cmd,\\x03");
    EXPECT_EQ(ctl::printable("a\x1b[2J\x7f"), "a\\x1B[2J\\x7F");
    EXPECT_EQ(ctl::printable("gr\xc3\xbc\xc3\x9f"), "gr\xc3\xbc\xc3\x9f");
}

TEST(MessageCatalogue, DescribesAResultWithItsParameter) {
    EXPECT_EQ(ctl::describeResult(1006, "ZAV1006E", "JUMP"),
              "ZAV1006E: the command is not supported [JUMP]");
    EXPECT_EQ(ctl::describeResult(1002, "ZAV1002E", ""),
              "ZAV1002E: the request has no transaction identifier");
    EXPECT_EQ(ctl::describeResult(1031, "", ""), "return code 1031");
}

}  // namespace
