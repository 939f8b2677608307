// String and CharStar: conversion from and to the code page, and numbers.

#include <gtest/gtest.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>

#include "support/trace_capture.h"
#include "support/units.h"

using ZAV::CharStar;
using ZAV::String;

namespace {

/// Conversions in the code page of a locale that the environment names.
void useLocale(const char* name) {
    ::setenv("LC_ALL", name, 1);
    ASSERT_TRUE(String::initialize());
}

class StringUtf8 : public testing::Test {
protected:
    void SetUp() override { useLocale("C.UTF-8"); }
};

class StringLatin1 : public testing::Test {
protected:
    void SetUp() override { useLocale("C"); }
};

TEST_F(StringUtf8, DecodesAndEncodes) {
    const String text("a\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80z");
    EXPECT_EQ(unitsOf(text), Units({'a', 0xE9, 0x20AC, 0xD83D, 0xDE00, 'z'}));
    EXPECT_TRUE(isTerminated(text));
}

TEST_F(StringUtf8, ReplacesMalformedBytes) {
    EXPECT_EQ(unitsOf(String("a\xFFz")), Units({'a', 0xFFFD, 'z'}));
    EXPECT_EQ(unitsOf(String("a\xC3")), Units({'a', 0xFFFD}));
}

TEST_F(StringUtf8, CutsAnArgumentInTheMidstOfACharacter) {
    EXPECT_EQ(unitsOf(String("a\xC3\xA9", 2)), Units({'a', 0xFFFD}));
    EXPECT_EQ(unitsOf(String("a\xC3\xA9", 3)), Units({'a', 0xE9}));
}

TEST_F(StringUtf8, OutputIsCutToOneBytePerUnit) {
    // Room for the text's units and its terminator, in whole characters.
    EXPECT_EQ(narrow(fromUnits({0xE9})), "\xC3\xA9");
    EXPECT_EQ(narrow(fromUnits({0xE9, 'a'})),
              "\xC3\xA9"
              "a");
    EXPECT_EQ(narrow(fromUnits({0xE9, 'a', 'b'})),
              "\xC3\xA9"
              "ab");
    EXPECT_EQ(narrow(fromUnits({0xE9, 0xE9})), "\xC3\xA9");
    EXPECT_EQ(narrow(fromUnits({0xE9, 0xE9, 'a'})), "\xC3\xA9\xC3\xA9");
    EXPECT_EQ(narrow(fromUnits({0xE9, 0xE9, 'a', 'b'})),
              "\xC3\xA9\xC3\xA9"
              "a");
    EXPECT_EQ(narrow(fromUnits({0x20AC})), "");
    EXPECT_EQ(narrow(fromUnits({0x20AC, 'a'})), "\xE2\x82\xAC");
    EXPECT_EQ(narrow(fromUnits({'a', 'b', 0x20AC})), "ab");
    EXPECT_EQ(narrow(fromUnits({0xD83D, 0xDE00})), "");
    EXPECT_EQ(narrow(fromUnits({0xD83D, 0xDE00, 'a'})), "\xF0\x9F\x98\x80");
    EXPECT_EQ(narrow(fromUnits({0xD83D})), "?");
}

TEST_F(StringUtf8, AZeroInTheMidstEndsTheNarrowText) {
    EXPECT_EQ(narrow(fromUnits({'a', 0, 'b'})), "a");
}

TEST_F(StringUtf8, AsciiOfEveryLengthSurvives) {
    for (std::size_t length = 0; length < 80; ++length) {
        std::string text;
        for (std::size_t i = 0; i < length; ++i)
            text += static_cast<char>('!' + i);
        const String wide(text.c_str());
        ASSERT_EQ(wide.length(), length);
        ASSERT_EQ(narrow(wide), text);
    }
}

TEST_F(StringLatin1, EveryByteSurvives) {
    std::string bytes;
    for (int byte = 1; byte < 256; ++byte)
        bytes += static_cast<char>(byte);
    const String text(bytes.c_str());
    ASSERT_EQ(text.length(), 255u);
    for (unsigned i = 0; i < 255; ++i)
        ASSERT_EQ(text[i], i + 1);
    EXPECT_EQ(narrow(text), bytes);
}

TEST_F(StringLatin1, ReplacesWhatItLacks) {
    EXPECT_EQ(narrow(fromUnits({'a', 0x20AC, 0xFF, 0xD83D, 0xDE00, 'b'})), "a?\xFF?b");
}

TEST_F(StringUtf8, ComparesWithNarrowTextInTheCodePage) {
    EXPECT_TRUE(fromUnits({0xE9}) == "\xC3\xA9");
    EXPECT_TRUE("\xC3\xA9" == fromUnits({0xE9}));
}

TEST_F(StringUtf8, UnicodeStringsBelongToTheCaller) {
    unsigned short* const units = String::createUnicodeString("a\xC3\xA9");
    EXPECT_EQ(Units(units, units + 3), Units({'a', 0xE9, 0}));
    unsigned short* const copy = String::copyUnicodeString(units);
    EXPECT_NE(copy, units);
    EXPECT_EQ(Units(copy, copy + 3), Units({'a', 0xE9, 0}));
    unsigned short* const part = String::createUnicodeString("abc", 2);
    EXPECT_EQ(Units(part, part + 3), Units({'a', 'b', 0}));
    unsigned short* const empty = String::createUnicodeString("");
    EXPECT_EQ(empty[0], 0);
    for (unsigned short* owned : {units, copy, part, empty})
        String::releaseUnicodeString(owned);
}

TEST(StringUnicode, NullStaysNull) {
    EXPECT_EQ(String::createUnicodeString(nullptr), nullptr);
    EXPECT_EQ(String::createUnicodeString(nullptr, 3), nullptr);
    EXPECT_EQ(String::copyUnicodeString(nullptr), nullptr);
    String::releaseUnicodeString(nullptr);
}

TEST(CharStar, CopiesDeeply) {
    char text[] = "text";
    const CharStar first(text);
    text[0] = 'T';
    EXPECT_STREQ(static_cast<const char*>(first), "text");
    CharStar second(first);
    EXPECT_NE(static_cast<const char*>(second), static_cast<const char*>(first));
    static_cast<char*>(second)[0] = 'n';
    EXPECT_STREQ(static_cast<const char*>(first), "text");
    EXPECT_STREQ(static_cast<const char*>(second), "next");
    second = first;
    EXPECT_STREQ(static_cast<const char*>(second), "text");
    EXPECT_NE(static_cast<const char*>(second), static_cast<const char*>(first));
    const CharStar& same = second;
    second = same;
    EXPECT_STREQ(static_cast<const char*>(second), "text");
}

TEST(CharStar, MovesAndKeepsNull) {
    CharStar first("text");
    CharStar second(std::move(first));
    EXPECT_STREQ(static_cast<const char*>(second), "text");
    CharStar none(static_cast<const char*>(nullptr));
    EXPECT_EQ(static_cast<char*>(none), nullptr);
    const CharStar copyOfNone(none);
    EXPECT_EQ(static_cast<char*>(copyOfNone), nullptr);
    none = std::move(second);
    EXPECT_STREQ(static_cast<const char*>(none), "text");
    none = copyOfNone;
    EXPECT_EQ(static_cast<char*>(none), nullptr);
}

struct NumberCase {
    const char* text;
    bool converts;
    int value;
    const char* error;  // its trace text
};

constexpr const char* kNotNumber = "Can't convert, buffer is not number: ";
constexpr const char* kTooLarge = "Can't convert, number is too large: ";

const NumberCase kNumbers[] = {
    {"42", true, 42, nullptr},
    {" 42", true, 42, nullptr},
    {"\t\n 42", true, 42, nullptr},
    {"-7", true, -7, nullptr},
    {"+7", true, 7, nullptr},
    {"007", true, 7, nullptr},
    {"", true, 0, nullptr},
    {"0", true, 0, nullptr},
    {"2147483646", true, 2147483646, nullptr},
    {"-2147483647", true, -2147483647, nullptr},
    {"42 ", false, 0, kNotNumber},
    {"x", false, 0, kNotNumber},
    {"4x", false, 0, kNotNumber},
    {"-", false, 0, kNotNumber},
    {" ", false, 0, kNotNumber},
    {"0x10", false, 0, kNotNumber},
    {"1.5", false, 0, kNotNumber},
    {"99999999999999999999x", false, 0, kNotNumber},
    {"2147483647", false, 0, kTooLarge},
    {"2147483648", false, 0, kTooLarge},
    {"-2147483648", false, 0, kTooLarge},
    {"-2147483649", false, 0, kTooLarge},
    {"4294967296", false, 0, kTooLarge},
    {"4294967338", false, 0, kTooLarge},
    {"99999999999999999999", false, 0, kTooLarge},
    {"-99999999999999999999", false, 0, kTooLarge},
};

class StringToInt : public testing::TestWithParam<NumberCase> {};

TEST_P(StringToInt, ConvertsOrSaysWhyNot) {
    const NumberCase& number = GetParam();
    const String text(number.text);
    const TraceCapture trace("ERROR");
    int value = 99;
    EXPECT_EQ(String::convertToInt(text, &value), number.converts);
    EXPECT_EQ(value, number.value);
    std::vector<std::string> errors;
    if (number.error != nullptr) errors.push_back(std::string(number.error) + number.text);
    EXPECT_EQ(trace.errors("zavstr"), errors);
}

INSTANTIATE_TEST_SUITE_P(All, StringToInt, testing::ValuesIn(kNumbers));

}  // namespace
