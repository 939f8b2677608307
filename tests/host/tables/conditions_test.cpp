#include "host/tables/conditions.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using host::CodePage;
using host::ConditionReader;

const oxa::Table& plainTable() {
    static const oxa::Table& table = *new oxa::Table{"TEST",
                                                     "PLAIN",
                                                     {{"NAME", 0, 8, OXA_TYPE_CHARACTER},
                                                      {"NUMBER", 8, 4, OXA_TYPE_INTEGER},
                                                      {"TEXT", 12, 16, OXA_TYPE_CHARACTER}}};
    return table;
}

/// The condition as text, or why it is refused.
template <typename Read>
std::string read(Read reading, const char* codePageName) {
    static const char* const names[] = {"=", "!=", "<", "<=", ">", ">=", "like"};
    const CodePage codePage(codePageName);
    try {
        const oxa::Predicate found = reading(ConditionReader(plainTable(), codePage));
        return found.column + names[found.op] + found.value;
    } catch (const host::BadRequest& bad) {
        return std::string("refused: ") + bad.what();
    }
}

std::string condition(const std::string& document, const char* codePage = "UTF-8") {
    return read(
        [&](const ConditionReader& reader) {
            return reader.fromJson(nlohmann::json::parse(document));
        },
        codePage);
}

std::string condition(const std::string& column, const std::string& op, const std::string& value) {
    return condition(R"({"column":")" + column + R"(","op":")" + op + R"(","value":)" + value +
                     "}");
}

std::string equality(const std::string& column, const std::string& text,
                     const char* codePage = "UTF-8") {
    return read([&](const ConditionReader& reader) { return reader.equality(column, text); },
                codePage);
}

TEST(Conditions, KnowEveryOperator) {
    for (const char* op : {"=", "!=", "<", "<=", ">", ">=", "like"}) {
        EXPECT_EQ("NAME" + std::string(op) + "a*", condition("NAME", op, R"("a*")"));
    }
    for (const char* op : {"", "==", "<>", "LIKE", "= "}) {
        EXPECT_EQ(
            "refused: unknown operator \"" + std::string(op) + "\": there are = != < <= > >= like",
            condition("NAME", op, R"("x")"));
    }
}

TEST(Conditions, OnIntegerColumnsTakeNumbersAndDecimalStrings) {
    EXPECT_EQ("NUMBER=7", condition("NUMBER", "=", "7"));
    EXPECT_EQ("NUMBER=7", condition("NUMBER", "=", R"("007")"));
    EXPECT_EQ("NUMBER=-2147483648", condition("NUMBER", "=", "-2147483648"));
    EXPECT_EQ("NUMBER=2147483647", condition("NUMBER", "=", R"("2147483647")"));
}

TEST(Conditions, OnIntegerColumnsTakeNothingElse) {
    for (const char* value : {"2147483648", "-2147483649", "18446744073709551615", "1.0", "1e3",
                              "true", "null", "[1]", "{}", R"("")", R"("x")", R"("1 ")", R"(" 1")",
                              R"("+1")", R"("0x1")", R"("1.0")", R"("2147483648")"}) {
        EXPECT_EQ("refused: the value of column NUMBER is not a whole number of 32 bits",
                  condition("NUMBER", "=", value))
            << value;
    }
    EXPECT_EQ("refused: column NUMBER is an integer; \"like\" compares characters",
              condition("NUMBER", "like", "1"));
}

TEST(Conditions, OnCharacterColumnsTakeStringsOnly) {
    for (const char* value : {"1", "1.5", "true", "null", "[]", "{}"}) {
        EXPECT_EQ("refused: the value of column NAME is not a string",
                  condition("NAME", "=", value));
    }
    EXPECT_EQ("refused: the value of column NAME holds the character 0",
              condition("NAME", "=", R"("a\u0000b")"));
}

TEST(Conditions, MayHaveValuesLongerThanTheirColumn) {
    const std::string value(3073, 'x');
    EXPECT_EQ("TEXT=" + value, condition("TEXT", "=", '"' + value + '"'));
}

TEST(Conditions, HaveTheirValuesInTheLocalCodePage) {
    EXPECT_EQ("NAME=\xE4",
              condition(R"({"column":"NAME","op":"=","value":"\u00e4"})", "ISO-8859-1"));
    EXPECT_EQ("refused: the value of column NAME holds what the host's code page ISO-8859-1 lacks",
              equality("NAME", "\xE6\x97\xA5", "ISO-8859-1"));
    EXPECT_EQ("refused: the value of column NAME holds what the host's code page UTF-8 lacks",
              equality("NAME", "\xFF"));
}

TEST(Conditions, OnUnknownColumnsAreRefusedByName) {
    EXPECT_EQ("refused: table PLAIN has no column \"NOPE\"", condition("NOPE", "=", "1"));
    EXPECT_EQ("refused: table PLAIN has no column \"name\"", condition("name", "=", R"("x")"));
    EXPECT_EQ("refused: table PLAIN has no column \"\"", condition("", "=", R"("x")"));
    EXPECT_EQ("refused: table PLAIN has no column \"name\"", equality("name", "x"));
}

TEST(Conditions, OfTheWrongShapeAreRefused) {
    EXPECT_EQ("refused: a condition is not an object", condition("1"));
    EXPECT_EQ("refused: a condition lacks its \"column\"", condition(R"({"op":"=","value":""})"));
    EXPECT_EQ("refused: a condition lacks its \"op\"",
              condition(R"({"column":"NAME","value":""})"));
    EXPECT_EQ("refused: a condition lacks its \"value\"",
              condition(R"({"column":"NAME","op":"="})"));
    EXPECT_EQ("refused: \"column\" of a condition is not a string",
              condition(R"({"column":1,"op":"=","value":""})"));
    EXPECT_EQ("refused: \"op\" of a condition is not a string",
              condition(R"({"column":"NAME","op":null,"value":""})"));
    EXPECT_EQ("refused: unknown member \"not\" in a condition",
              condition(R"({"column":"NAME","op":"=","value":"","not":true})"));
}

TEST(Conditions, OfEqualityTakeTextForEveryColumn) {
    EXPECT_EQ("NAME=a b", equality("NAME", "a b"));
    EXPECT_EQ("NUMBER=5", equality("NUMBER", "5"));
    EXPECT_EQ("TEXT=", equality("TEXT", ""));
    EXPECT_EQ("refused: the value of column NUMBER is not a whole number of 32 bits",
              equality("NUMBER", "x"));
}

}  // namespace
