#include "ctl/show/rows.h"

#include <nlohmann/json.hpp>

namespace {

using nlohmann::json;

TEST(Rows, ReadsTextsAndReturnCodesAndTakesMissingOnesForEmpty) {
    const json row = {{"RETVAL", 1024}, {"RETMSGID", "ZAV1024E"}, {"RETMSGPARM", "cmd"}};
    EXPECT_EQ(ctl::returnCodeOf(row), 1024);
    EXPECT_EQ(ctl::textOf(row, "RETMSGID"), "ZAV1024E");
    EXPECT_EQ(ctl::textOf(row, "NOPE"), "");
    EXPECT_EQ(ctl::returnCodeOf(json::object()), 0);
    EXPECT_EQ(ctl::returnCodeOf(json{{"RETVAL", "x"}}), 0);
}

TEST(Rows, PrintsAnAlignedTableByCharactersNotBytes) {
    testing::internal::CaptureStdout();
    ctl::printTable(json::array({{{"P", "ux"}, {"D", "gr\xc3\xbc\xc3\x9f"}, {"E", "1"}},
                                 {{"P", "longer"}, {"D", "x"}, {"E", "2"}}}),
                    {{"P", "PRODUCT"}, {"D", "DESC"}, {"E", "N"}});
    EXPECT_EQ(testing::internal::GetCapturedStdout(),
              "PRODUCT  DESC  N\n"
              "ux       gr\xc3\xbc\xc3\x9f  1\n"
              "longer   x     2\n");
}

TEST(Rows, PrintsRecordsWithoutEmptyColumns) {
    testing::internal::CaptureStdout();
    ctl::printRecords(json::array({{{"A", "1"}, {"BB", ""}, {"CCC", 3}}, {{"A", "x\ny"}}}));
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "A    1\nCCC  3\n\nA  x\\x0Ay\n");
}

TEST(Rows, PrintsTextThatIsNoValidUtf8) {
    testing::internal::CaptureStdout();
    ctl::printJson({{"A", "\xff"}});
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "{\n  \"A\": \"\xef\xbf\xbd\"\n}\n");
}

}  // namespace
