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
    } catch (const routes::BadRequest& bad) {
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
        EXPECT_EQ(condition("NAME", op, R"("a*")"), "NAME" + std::string(op) + "a*");
    }
    for (const char* op : {"", "==", "<>", "LIKE", "= "}) {
        EXPECT_EQ(
            condition("NAME", op, R"("x")"),
            "refused: unknown operator \"" + std::string(op) + "\": there are = != < <= > >= like");
    }
}

TEST(Conditions, OnIntegerColumnsTakeNumbersAndDecimalStrings) {
    EXPECT_EQ(condition("NUMBER", "=", "7"), "NUMBER=7");
    EXPECT_EQ(condition("NUMBER", "=", R"("007")"), "NUMBER=7");
    EXPECT_EQ(condition("NUMBER", "=", "-2147483648"), "NUMBER=-2147483648");
    EXPECT_EQ(condition("NUMBER", "=", R"("2147483647")"), "NUMBER=2147483647");
}

TEST(Conditions, OnIntegerColumnsTakeNothingElse) {
    for (const char* value : {"2147483648", "-2147483649", "18446744073709551615", "1.0", "1e3",
                              "true", "null", "[1]", "{}", R"("")", R"("x")", R"("1 ")", R"(" 1")",
                              R"("+1")", R"("0x1")", R"("1.0")", R"("2147483648")"}) {
        EXPECT_EQ(condition("NUMBER", "=", value),
                  "refused: the value of column NUMBER is not a whole number of 32 bits")
            << value;
    }
    EXPECT_EQ(condition("NUMBER", "like", "1"),
              "refused: column NUMBER is an integer; \"like\" compares characters");
}

TEST(Conditions, OnCharacterColumnsTakeStringsOnly) {
    for (const char* value : {"1", "1.5", "true", "null", "[]", "{}"}) {
        EXPECT_EQ(condition("NAME", "=", value),
                  "refused: the value of column NAME is not a string");
    }
    EXPECT_EQ(condition("NAME", "=", R"("a\u0000b")"),
              "refused: the value of column NAME holds the character 0");
}

TEST(Conditions, MayHaveValuesLongerThanTheirColumn) {
    const std::string value(3073, 'x');
    EXPECT_EQ(condition("TEXT", "=", '"' + value + '"'), "TEXT=" + value);
}

TEST(Conditions, HaveTheirValuesInTheLocalCodePage) {
    EXPECT_EQ(condition(R"({"column":"NAME","op":"=","value":"\u00e4"})", "ISO-8859-1"),
              "NAME=\xE4");
    EXPECT_EQ(equality("NAME", "\xE6\x97\xA5", "ISO-8859-1"),
              "refused: the value of column NAME holds what the host's code page ISO-8859-1 lacks");
    EXPECT_EQ(equality("NAME", "\xFF"),
              "refused: the value of column NAME holds what the host's code page UTF-8 lacks");
}

TEST(Conditions, OnUnknownColumnsAreRefusedByName) {
    EXPECT_EQ(condition("NOPE", "=", "1"), "refused: table PLAIN has no column \"NOPE\"");
    EXPECT_EQ(condition("name", "=", R"("x")"), "refused: table PLAIN has no column \"name\"");
    EXPECT_EQ(condition("", "=", R"("x")"), "refused: table PLAIN has no column \"\"");
    EXPECT_EQ(equality("name", "x"), "refused: table PLAIN has no column \"name\"");
}

TEST(Conditions, OfTheWrongShapeAreRefused) {
    EXPECT_EQ(condition("1"), "refused: a condition is not an object");
    EXPECT_EQ(condition(R"({"op":"=","value":""})"), "refused: a condition lacks its \"column\"");
    EXPECT_EQ(condition(R"({"column":"NAME","value":""})"),
              "refused: a condition lacks its \"op\"");
    EXPECT_EQ(condition(R"({"column":"NAME","op":"="})"),
              "refused: a condition lacks its \"value\"");
    EXPECT_EQ(condition(R"({"column":1,"op":"=","value":""})"),
              "refused: \"column\" of a condition is not a string");
    EXPECT_EQ(condition(R"({"column":"NAME","op":null,"value":""})"),
              "refused: \"op\" of a condition is not a string");
    EXPECT_EQ(condition(R"({"column":"NAME","op":"=","value":"","not":true})"),
              "refused: unknown member \"not\" in a condition");
}

TEST(Conditions, OfEqualityTakeTextForEveryColumn) {
    EXPECT_EQ(equality("NAME", "a b"), "NAME=a b");
    EXPECT_EQ(equality("NUMBER", "5"), "NUMBER=5");
    EXPECT_EQ(equality("TEXT", ""), "TEXT=");
    EXPECT_EQ(equality("NUMBER", "x"),
              "refused: the value of column NUMBER is not a whole number of 32 bits");
}

}  // namespace
