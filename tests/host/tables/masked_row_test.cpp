#include "host/tables/masked_row.h"

#include <gtest/gtest.h>

#include "host/made_up_table.h"

namespace {

oxa::Table outcomeTable() {
    return {"TEST",
            "KAGDYST",
            {{"TRANSID", 0, 12, OXA_TYPE_CHARACTER},
             {"RETVAL", 12, 4, OXA_TYPE_INTEGER},
             {"RETMSGPARM", 16, 16, OXA_TYPE_CHARACTER},
             {"TARGETMSN", 32, 12, OXA_TYPE_CHARACTER}}};
}

std::string row(const std::string& text) {
    return RowBuilder().text("key:7", 12).integer(0x3A3D).text(text, 16).text("monkey:UX", 12);
}

TEST(MaskedRow, HidesSecretsInFreeTextAndLeavesNamesAndNumbers) {
    EXPECT_EQ(host::maskedRow(outcomeTable(), row("pwd=hunter2 bad")), row("pwd=*** bad"));
    EXPECT_EQ(host::maskedRow(outcomeTable(), row("all is well")), row("all is well"));
}

TEST(MaskedRow, KeepsItsLengthWhenTheMaskIsLongerThanTheValue) {
    EXPECT_EQ(host::maskedRow(outcomeTable(), row("a password is=1x")), row("a password is=1x"));
    EXPECT_EQ(host::maskedRow(outcomeTable(), row("the password=1x")), row("the password=***"));
    EXPECT_EQ(host::maskedRow(outcomeTable(), row("this password=1")), row("this password=**"));
}

TEST(MaskedRow, ForReadersHasNoValuesOfItsMessage) {
    EXPECT_EQ(host::rowForReaders(outcomeTable(), row("what it wrote")), row(""));
    EXPECT_EQ(host::rowForReaders(outcomeTable(), row("")), row(""));
    EXPECT_EQ(host::rowForReaders(outcomeTable(), "x"), "x");
}

TEST(MaskedRow, OfTheWrongLengthIsLeftAlone) {
    EXPECT_EQ(host::maskedRow(outcomeTable(), "pwd=x"), "pwd=x");
    EXPECT_EQ(host::maskedRow(outcomeTable(), ""), "");
}

}  // namespace
