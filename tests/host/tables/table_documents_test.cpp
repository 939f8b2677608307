#include "host/tables/table_documents.h"

#include <gtest/gtest.h>

#include "host/made_up_table.h"

namespace {

using host::CodePage;

const oxa::Table& plainTable() {
    static const oxa::Table& table = *new oxa::Table{"TEST",
                                                     "PLAIN",
                                                     {{"NAME", 0, 8, OXA_TYPE_CHARACTER},
                                                      {"NUMBER", 8, 4, OXA_TYPE_INTEGER},
                                                      {"TEXT", 12, 16, OXA_TYPE_CHARACTER}}};
    return table;
}

std::string document(const std::string& row) {
    return host::rowDocument(plainTable(), row, CodePage("UTF-8"));
}

TEST(TableDocuments, RowHasItsColumnsInOrderWithoutTrailingBlanks) {
    EXPECT_EQ(document(plainRow("ux", -7, " a b ")), R"({"NAME":"ux","NUMBER":-7,"TEXT":" a b"})");
}

TEST(TableDocuments, AllBlanksAreAnEmptyString) {
    EXPECT_EQ(document(plainRow("", 0, "")), R"({"NAME":"","NUMBER":0,"TEXT":""})");
}

TEST(TableDocuments, AFieldOfFullWidthIsWhole) {
    EXPECT_EQ(document(plainRow("123456789", 2147483647, "12345678901234567")),
              R"({"NAME":"12345678","NUMBER":2147483647,"TEXT":"1234567890123456"})");
}

TEST(TableDocuments, ControlCharactersAndQuotesAreEscaped) {
    EXPECT_EQ(document(plainRow("\"\\", 1, "a\nb\tc\x01")),
              R"({"NAME":"\"\\","NUMBER":1,"TEXT":"a\nb\tc\u0001"})");
}

TEST(TableDocuments, ACharacterCutAtTheColumnsEndIsReplaced) {
    EXPECT_EQ(document(plainRow("1234567\xC3\xA4", 1, "")),
              "{\"NAME\":\"1234567\xEF\xBF\xBD\",\"NUMBER\":1,\"TEXT\":\"\"}");
}

TEST(TableDocuments, CodesThatNoUnicodeCharacterHasAreReplaced) {
    const std::string text = document(plainRow("\xF5\x80\x80\x80", 1, "\xED\xA0\x80"));
    EXPECT_NE(text.find("\xEF\xBF\xBD"), std::string::npos);
    EXPECT_EQ(text.find('\xF5'), std::string::npos);
    EXPECT_EQ(text.find("\xED\xA0"), std::string::npos);
}

TEST(TableDocuments, ARowThatIsTooShortReadsAsEmpty) {
    EXPECT_EQ(document("short"), R"({"NAME":"","NUMBER":0,"TEXT":""})");
}

TEST(TableDocuments, RowsStandInAnArray) {
    oxa::Rows rows;
    rows.rowSize = 28;
    EXPECT_EQ(host::rowsDocument(plainTable(), rows, CodePage("UTF-8")), R"({"rows":[]})");
    rows.bytes = plainRow("a", 1, "") + plainRow("b", 2, "");
    EXPECT_EQ(host::rowsDocument(plainTable(), rows, CodePage("UTF-8")),
              R"({"rows":[{"NAME":"a","NUMBER":1,"TEXT":""},{"NAME":"b","NUMBER":2,"TEXT":""}]})");
}

TEST(TableDocuments, TablesAreListedWithTheirColumns) {
    EXPECT_EQ(host::tablesDocument({plainTable()}),
              R"({"tables":[{"application":"TEST","name":"PLAIN","columns":[)"
              R"({"name":"NAME","offset":0,"length":8,"type":9},)"
              R"({"name":"NUMBER","offset":8,"length":4,"type":3},)"
              R"({"name":"TEXT","offset":12,"length":16,"type":9}]}]})");
    EXPECT_EQ(host::tablesDocument({}), R"({"tables":[]})");
}

}  // namespace
