// String: making, assigning, comparing and printing texts.

#include "base/zavstr.h"

#include <gtest/gtest.h>

#include <memory>
#include <sstream>
#include <type_traits>

#include "support/units.h"

using ZAV::Array;
using ZAV::IndexOutOfBoundsException;
using ZAV::String;

namespace {

std::string printed(const String& text) {
    std::ostringstream out;
    out << text;
    return out.str();
}

TEST(String, HasOneVirtualDestructorAndOneMember) {
    static_assert(std::has_virtual_destructor_v<String>);
    static_assert(sizeof(String) == sizeof(void*) + sizeof(Array<unsigned short>));
    static_assert(std::is_nothrow_move_assignable_v<String>);
}

TEST(String, NposIsAllBitsOf32) {
    static_assert(String::NPOS == 4294967295u);
    static_assert(sizeof(String::NPOS) == 4);
    const std::uint32_t& referenced = String::NPOS;
    EXPECT_EQ(referenced, 0xFFFFFFFFu);
}

TEST(String, IsEmptyByDefault) {
    const String text;
    EXPECT_EQ(text.length(), 0u);
    EXPECT_EQ(text.size(), 0u);
    EXPECT_EQ(text[0], 0);
    EXPECT_EQ(text.getData()[0], 0);
}

TEST(String, OfANullPointerIsEmpty) {
    EXPECT_EQ(String(static_cast<const char*>(nullptr)).length(), 0u);
    EXPECT_EQ(String(static_cast<const unsigned short*>(nullptr)).length(), 0u);
    EXPECT_EQ(String(static_cast<const char*>(nullptr), 3).length(), 0u);
}

TEST(String, CopiesDeeply) {
    String original("abc");
    const String copy(original);
    original.append('d');
    EXPECT_EQ(copy, "abc");
    EXPECT_EQ(original, "abcd");
}

TEST(String, TakesTheFirstUnitsOfAnother) {
    EXPECT_EQ(String(String("abcdef"), 3), "abc");
    EXPECT_EQ(String(String("abcdef"), 0), "");
    EXPECT_EQ(String(String("abc"), 3), "abc");
    EXPECT_TRUE(isTerminated(String(String("abcdefghijkl"), 9)));
}

TEST(String, TakesTheFirstBytes) {
    EXPECT_EQ(String("abcdef", 3), "abc");
    EXPECT_EQ(String("abcdef", 0), "");
    EXPECT_EQ(String("abc", 4000000000u), "abc");
    EXPECT_EQ(String("ab\0cd", 5), "ab");
}

TEST(String, TakesUnits) {
    const unsigned short units[] = {'a', 0x20AC, 0xD83D, 0xDE00, 0};
    const String text(units);
    EXPECT_EQ(unitsOf(text), Units({'a', 0x20AC, 0xD83D, 0xDE00}));
    EXPECT_TRUE(isTerminated(text));
    String assigned("old");
    assigned = units;
    EXPECT_EQ(assigned, text);
    assigned = static_cast<const unsigned short*>(nullptr);
    EXPECT_EQ(assigned.length(), 0u);
}

TEST(String, MovesLeaveAnEmptyText) {
    String from("a text that is longer than eight units");
    String to(std::move(from));
    EXPECT_EQ(to, "a text that is longer than eight units");
    EXPECT_EQ(from.length(), 0u);  // NOLINT(bugprone-use-after-move): what is left is the subject
    EXPECT_TRUE(isTerminated(from));
    from.append(String("usable"));
    to = std::move(from);
    EXPECT_EQ(to, "usable");
    EXPECT_EQ(from.length(), 0u);  // NOLINT(bugprone-use-after-move)
    EXPECT_TRUE(isTerminated(from));
    String& same = to;
    to = std::move(same);
    EXPECT_EQ(to, "usable");
}

TEST(StringAssign, ReplacesTheText) {
    String text("before");
    EXPECT_EQ(&text.assign("after"), &text);
    EXPECT_EQ(text, "after");
    EXPECT_EQ(text.assign("after", 2), "af");
    EXPECT_EQ(text.assign(String("whole")), "whole");
    EXPECT_EQ(text.assign(String("whole"), 3), "who");
    EXPECT_EQ(text.assign(static_cast<const char*>(nullptr)), "");
    EXPECT_EQ(text.assign("x").assign(static_cast<const char*>(nullptr), 3), "");
    EXPECT_TRUE(isTerminated(text));
}

TEST(StringAssign, KeepsZerosAmongCountedUnits) {
    const unsigned short units[] = {'a', 0, 'b'};
    String text;
    text.assign(units, 3);
    EXPECT_EQ(unitsOf(text), Units({'a', 0, 'b'}));
    EXPECT_EQ(text.length(), 3u);
    EXPECT_TRUE(isTerminated(text));
    text.assign(static_cast<const unsigned short*>(nullptr), 3);
    EXPECT_EQ(text.length(), 0u);
}

TEST(StringAssign, ToItselfOrAPartOfItselfIsSafe) {
    String text("0123456789");
    const String& same = text;
    text = same;
    EXPECT_EQ(text, "0123456789");
    text.assign(text);
    EXPECT_EQ(text, "0123456789");
    text.assign(text, 7);
    EXPECT_EQ(text, "0123456");
    text = text.getData() + 2;
    EXPECT_EQ(text, "23456");
}

TEST(StringAssign, TooLongACountIsRefused) {
    String text("kept");
    const unsigned short unit = 'a';
    EXPECT_THROW(text.assign(&unit, 0xFFFFFFFFu), std::length_error);
    EXPECT_EQ(text, "kept");
}

TEST(String, ClearEmpties) {
    String text("something longer than the first block");
    text.clear();
    EXPECT_EQ(text.length(), 0u);
    EXPECT_TRUE(isTerminated(text));
}

TEST(String, SubscriptReachesTheTerminator) {
    String text("abc");
    EXPECT_EQ(text[0], 'a');
    EXPECT_EQ(text[3], 0);
    EXPECT_EQ(static_cast<const String&>(text)[3], 0);
    text[1] = 'X';
    EXPECT_EQ(text, "aXc");
}

TEST(StringCompare, GoesByUnit) {
    EXPECT_EQ(String::compare("ab", "abc"), -1);
    EXPECT_EQ(String::compare("abc", "ab"), 1);
    EXPECT_EQ(String::compare("b", "a"), 1);
    EXPECT_EQ(String::compare("a", "A"), 32);
    EXPECT_EQ(String::compare("A", "a"), -32);
    EXPECT_EQ(String::compare("", ""), 0);
    EXPECT_EQ(String::compare("", "a"), -1);
    EXPECT_EQ(String::compare("a", ""), 1);
    EXPECT_EQ(String::compare(fromUnits({0xFFFF}), fromUnits({1})), 0xFFFE);
}

TEST(StringCompare, TakesRawUnits) {
    const unsigned short a[] = {'x', 'z', 0};
    const unsigned short b[] = {'x', 'y', 0};
    EXPECT_EQ(String::compare(a, b), 1);
    EXPECT_EQ(String::compare(a, a), 0);
}

TEST(StringCompare, StopsAtAZero) {
    EXPECT_EQ(String::compare(fromUnits({'a', 0, 'x'}), fromUnits({'a', 0, 'y'})), 0);
}

TEST(StringCompare, Operators) {
    EXPECT_TRUE(String("a") == String("a"));
    EXPECT_FALSE(String("a") == String("b"));
    EXPECT_TRUE(String("a") != String("b"));
    EXPECT_FALSE(String("a") != String("a"));
    EXPECT_TRUE("a" == String("a"));
    EXPECT_TRUE(String("a") == "a");
    EXPECT_FALSE("a" == String("A"));
    EXPECT_FALSE(String("a") == "A");
}

TEST(String, PlusJoins) {
    const String a("left");
    EXPECT_EQ(a + String("right"), "leftright");
    EXPECT_EQ(a + String(), "left");
    EXPECT_EQ(String() + a, "left");
    EXPECT_EQ(a, "left");
}

TEST(StringPrint, EscapesWhatIsNotAscii) {
    EXPECT_EQ(printed("plain ~ text"), "plain ~ text");
    EXPECT_EQ(printed(fromUnits({0xE9})), "\\x00E9");
    EXPECT_EQ(printed(fromUnits({'a', 0x20AC, 'b'})), "a\\x20ACb");
    EXPECT_EQ(printed(fromUnits({1, 127})), "\x01\x7F");
    EXPECT_EQ(printed(fromUnits({128, 0})), "\\x0080\\x0000");
    EXPECT_EQ(printed(fromUnits({'\\'})), "\\");
    EXPECT_EQ(printed(String()), "");
}

TEST(IndexOutOfBoundsException, CarriesLineAndFile) {
    const IndexOutOfBoundsException thrown(42, "zavstr");
    EXPECT_STREQ(thrown.getErrorMessage(), "line: 42, file: zavstr");
    EXPECT_EQ(sizeof thrown, 512u);
    const IndexOutOfBoundsException copy(thrown);
    EXPECT_STREQ(copy.getErrorMessage(), "line: 42, file: zavstr");
}

TEST(IndexOutOfBoundsException, CutsALongName) {
    const std::string name(600, 'n');
    const IndexOutOfBoundsException thrown(1, name.c_str());
    EXPECT_EQ(std::string(thrown.getErrorMessage()), ("line: 1, file: " + name).substr(0, 511));
}

}  // namespace
