// What oxa.h promises of comparisons.

#include <cstdint>
#include <string>
#include <vector>

#include "conformance/rule.h"
#include "conformance/sample_table.h"

namespace conformance {
namespace {

const char* nameOf(_IntfOper op) {
    static constexpr const char* kNames[] = {"=", "!=", "<", "<=", ">", ">=", "like"};
    return kNames[op];
}

struct TextCase {
    std::string field;
    _IntfOper op;
    std::string value;
    int expected;
};

void compareTexts(const std::vector<TextCase>& cases) {
    for (const TextCase& each : cases) {
        requireEqual(SampleRequest::IsException(each.op, each.field.data(), each.value.c_str(),
                                                static_cast<int>(each.field.size())),
                     each.expected,
                     shown(each.field) + " " + nameOf(each.op) + " " + shown(each.value));
    }
}

void takesBothAsPadded(Bench&) {
    compareTexts({{"ux      ", OPER_EQ, "ux", 1},
                  {"ux      ", OPER_EQ, "ux  ", 1},
                  {"ux      ", OPER_EQ, "ux                 ", 1},
                  {"ux      ", OPER_EQ, "u", 0},
                  {"ux      ", OPER_EQ, "uxx", 0},
                  {"ux      ", OPER_EQ, "UX", 0},
                  {"        ", OPER_EQ, "", 1},
                  {"abc", OPER_NE, "ab", 1}});
}

void comparesNoMoreThanTheField(Bench&) {
    compareTexts({{"abc", OPER_EQ, "abcdef", 1},
                  {"abc", OPER_EQ, "abd", 0},
                  {"abc", OPER_NE, "abcdef", 0},
                  {"", OPER_EQ, "anything", 1}});
}

void ordersByUnsignedBytes(Bench&) {
    compareTexts({{"b  ", OPER_LT, "c", 1},
                  {"b  ", OPER_LT, "b", 0},
                  {"b  ", OPER_LE, "b", 1},
                  {"b  ", OPER_GT, "a", 1},
                  {"b  ", OPER_GT, "b", 0},
                  {"b  ", OPER_GE, "b", 1},
                  {"b  ", OPER_GE, "bz", 0},
                  {"bz ", OPER_GT, "b", 1},
                  {"b\tx", OPER_LT, "b", 1},
                  {"\xE4  ", OPER_GT, "z", 1},
                  {std::string("b\0\0", 3), OPER_LT, "b", 1}});
}

void matchesPatterns(Bench&) {
    compareTexts({{"install ", OPER_LIKE, "*", 1},
                  {"        ", OPER_LIKE, "*", 1},
                  {"install ", OPER_LIKE, "install", 1},
                  {"install ", OPER_LIKE, "inst", 0},
                  {"install ", OPER_LIKE, "inst*", 1},
                  {"install ", OPER_LIKE, "*all", 1},
                  {"install ", OPER_LIKE, "*all  ", 1},
                  {"install ", OPER_LIKE, "i*l", 1},
                  {"install ", OPER_LIKE, "*sta*", 1},
                  {"install ", OPER_LIKE, "**t**", 1},
                  {"install ", OPER_LIKE, "*stall*x", 0},
                  {"install ", OPER_LIKE, "x*", 0},
                  {"aabaabaa", OPER_LIKE, "*aab*aa", 1},
                  {"a b     ", OPER_LIKE, "a b", 1},
                  {"        ", OPER_LIKE, "", 1},
                  {"x       ", OPER_LIKE, "", 0}});
}

void cutsPatternsAtTheFieldsWidth(Bench&) {
    compareTexts({{"abc", OPER_LIKE, "abcdef", 1},
                  {"abc", OPER_LIKE, "abcdef*", 1},
                  {"abc", OPER_LIKE, "*b*c*", 1}});
}

/// Takes hours where the time doubles with every "*"; the rule's time limit sees that.
void isNotSlowForHostilePatterns(Bench&) {
    const std::string field(3000, 'a');
    std::string pattern;
    for (int i = 0; i < 1000; ++i)
        pattern += "*a";
    compareTexts({{field, OPER_LIKE, pattern + "b", 0}, {field, OPER_LIKE, pattern, 1}});
}

struct NumberCase {
    int field;
    _IntfOper op;
    std::string value;
    int expected;
};

void compareNumbers(const std::vector<NumberCase>& cases) {
    for (const NumberCase& each : cases) {
        requireEqual(SampleRequest::IsException(each.op, each.field, each.value.c_str()),
                     each.expected,
                     shown(each.field) + " " + nameOf(each.op) + " " + shown(each.value));
    }
}

void comparesNumbers(Bench&) {
    compareNumbers({{7, OPER_EQ, "7", 1},
                    {7, OPER_EQ, " 7  ", 1},
                    {7, OPER_EQ, "+7", 1},
                    {7, OPER_EQ, "007", 1},
                    {-7, OPER_EQ, "-7", 1},
                    {7, OPER_NE, "8", 1},
                    {7, OPER_NE, "7", 0},
                    {7, OPER_LT, "8", 1},
                    {7, OPER_LT, "7", 0},
                    {7, OPER_LE, "7", 1},
                    {7, OPER_GT, "-1", 1},
                    {7, OPER_GE, "8", 0}});
}

void comparesWithNumbersOfAnySize(Bench&) {
    compareNumbers({{INT32_MAX, OPER_LT, "2147483648", 1},
                    {INT32_MIN, OPER_GT, "-99999999999999999999999", 1}});
}

void comparesDigitsWithPatterns(Bench&) {
    compareNumbers(
        {{1002, OPER_LIKE, "10*", 1}, {1002, OPER_LIKE, "*3", 0}, {1002, OPER_LIKE, "1002 ", 1}});
}

void neverMatchesWhatIsNoNumber(Bench&) {
    compareNumbers({{0, OPER_EQ, "", 0},
                    {0, OPER_EQ, " ", 0},
                    {0, OPER_NE, "zero", 0},
                    {1, OPER_EQ, "1x", 0},
                    {1, OPER_EQ, "1 2", 0},
                    {16, OPER_EQ, "0x10", 0}});
}

}  // namespace

std::vector<Operation> oxaComparisonOperations() {
    return {
        {"rtoxa::IsException(text)",
         {{"takes field and value as blank-padded", takesBothAsPadded},
          {"compares no more of the value than the field's width", comparesNoMoreThanTheField},
          {"orders by unsigned bytes", ordersByUnsignedBytes},
          {"matches patterns", matchesPatterns},
          {"cuts patterns at the field's width", cutsPatternsAtTheFieldsWidth},
          {"is not slow for hostile patterns", isNotSlowForHostilePatterns}}},
        {"rtoxa::IsException(number)",
         {{"compares numbers", comparesNumbers},
          {"compares with numbers of any size", comparesWithNumbersOfAnySize},
          {"compares the digits with a pattern", comparesDigitsWithPatterns},
          {"never matches what is no number", neverMatchesWhatIsNoNumber}}},
    };
}

}  // namespace conformance
