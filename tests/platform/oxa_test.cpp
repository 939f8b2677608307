#include "platform/oxa.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <unistd.h>

#include <string>

#include "embedded/oxa_host.h"
#include "platform/sample_table.h"
#include "support/trace_capture.h"

namespace {

struct Comparison {
    std::string field;
    _IntfOper op;
    std::string value;
    int expected;
};

void PrintTo(const Comparison& c, std::ostream* out) {
    *out << "[" << c.field << "] op " << c.op << " [" << c.value << "]";
}

class CharacterComparison : public testing::TestWithParam<Comparison> {};

TEST_P(CharacterComparison, GivesTheExpectedAnswer) {
    const Comparison& c = GetParam();
    EXPECT_EQ(c.expected, SampleRequest::IsException(c.op, c.field.data(), c.value.c_str(),
                                                     static_cast<int>(c.field.size())));
}

INSTANTIATE_TEST_SUITE_P(
    Equality, CharacterComparison,
    testing::Values(Comparison{"ux      ", OPER_EQ, "ux", 1},
                    Comparison{"ux      ", OPER_EQ, "ux  ", 1},
                    Comparison{"ux      ", OPER_EQ, "ux                 ", 1},
                    Comparison{"ux      ", OPER_EQ, "u", 0},
                    Comparison{"ux      ", OPER_EQ, "uxx", 0},
                    Comparison{"ux      ", OPER_EQ, "UX", 0},
                    Comparison{"        ", OPER_EQ, "", 1}, Comparison{"abc", OPER_EQ, "abcdef", 1},
                    Comparison{"abc", OPER_EQ, "abd", 0}, Comparison{"abc", OPER_NE, "abcdef", 0},
                    Comparison{"abc", OPER_NE, "ab", 1}, Comparison{"", OPER_EQ, "anything", 1}));

INSTANTIATE_TEST_SUITE_P(
    Order, CharacterComparison,
    testing::Values(Comparison{"b  ", OPER_LT, "c", 1}, Comparison{"b  ", OPER_LT, "b", 0},
                    Comparison{"b  ", OPER_LE, "b", 1}, Comparison{"b  ", OPER_GT, "a", 1},
                    Comparison{"b  ", OPER_GT, "b", 0}, Comparison{"b  ", OPER_GE, "b", 1},
                    Comparison{"b  ", OPER_GE, "bz", 0}, Comparison{"bz ", OPER_GT, "b", 1},
                    Comparison{"b\tx", OPER_LT, "b", 1}, Comparison{"\xE4  ", OPER_GT, "z", 1},
                    Comparison{std::string("b\0\0", 3), OPER_LT, "b", 1}));

INSTANTIATE_TEST_SUITE_P(
    Like, CharacterComparison,
    testing::Values(
        Comparison{"install ", OPER_LIKE, "*", 1}, Comparison{"        ", OPER_LIKE, "*", 1},
        Comparison{"install ", OPER_LIKE, "install", 1},
        Comparison{"install ", OPER_LIKE, "inst", 0}, Comparison{"install ", OPER_LIKE, "inst*", 1},
        Comparison{"install ", OPER_LIKE, "*all", 1},
        Comparison{"install ", OPER_LIKE, "*all  ", 1}, Comparison{"install ", OPER_LIKE, "i*l", 1},
        Comparison{"install ", OPER_LIKE, "*sta*", 1},
        Comparison{"install ", OPER_LIKE, "**t**", 1},
        Comparison{"install ", OPER_LIKE, "*stall*x", 0},
        Comparison{"install ", OPER_LIKE, "x*", 0}, Comparison{"aabaabaa", OPER_LIKE, "*aab*aa", 1},
        Comparison{"a b     ", OPER_LIKE, "a b", 1}, Comparison{"abc", OPER_LIKE, "abcdef", 1},
        Comparison{"abc", OPER_LIKE, "abcdef*", 1}, Comparison{"abc", OPER_LIKE, "*b*c*", 1},
        Comparison{"        ", OPER_LIKE, "", 1}, Comparison{"x       ", OPER_LIKE, "", 0}));

TEST(CharacterComparison, AHostilePatternCostsNoMoreThanItsLengthTimesTheFields) {
    const std::string field(3000, 'a');
    std::string pattern;
    for (int i = 0; i < 1000; ++i)
        pattern += "*a";
    EXPECT_EQ(0,
              SampleRequest::IsException(OPER_LIKE, field.data(), (pattern + "b").c_str(), 3000));
    EXPECT_EQ(1, SampleRequest::IsException(OPER_LIKE, field.data(), pattern.c_str(), 3000));
}

struct IntegerCase {
    int field;
    _IntfOper op;
    std::string value;
    int expected;
};

class IntegerComparison : public testing::TestWithParam<IntegerCase> {};

TEST_P(IntegerComparison, GivesTheExpectedAnswer) {
    const IntegerCase& c = GetParam();
    EXPECT_EQ(c.expected, SampleRequest::IsException(c.op, c.field, c.value.c_str()));
}

INSTANTIATE_TEST_SUITE_P(
    Numbers, IntegerComparison,
    testing::Values(IntegerCase{7, OPER_EQ, "7", 1}, IntegerCase{7, OPER_EQ, " 7  ", 1},
                    IntegerCase{7, OPER_EQ, "+7", 1}, IntegerCase{7, OPER_EQ, "007", 1},
                    IntegerCase{-7, OPER_EQ, "-7", 1}, IntegerCase{7, OPER_NE, "8", 1},
                    IntegerCase{7, OPER_NE, "7", 0}, IntegerCase{7, OPER_LT, "8", 1},
                    IntegerCase{7, OPER_LT, "7", 0}, IntegerCase{7, OPER_LE, "7", 1},
                    IntegerCase{7, OPER_GT, "-1", 1}, IntegerCase{7, OPER_GE, "8", 0},
                    IntegerCase{INT32_MAX, OPER_LT, "2147483648", 1},
                    IntegerCase{INT32_MIN, OPER_GT, "-99999999999999999999999", 1},
                    IntegerCase{1002, OPER_LIKE, "10*", 1}, IntegerCase{1002, OPER_LIKE, "*3", 0},
                    IntegerCase{1002, OPER_LIKE, "1002 ", 1}));

INSTANTIATE_TEST_SUITE_P(
    NoNumber, IntegerComparison,
    testing::Values(IntegerCase{0, OPER_EQ, "", 0}, IntegerCase{0, OPER_EQ, " ", 0},
                    IntegerCase{0, OPER_NE, "zero", 0}, IntegerCase{1, OPER_EQ, "1x", 0},
                    IntegerCase{1, OPER_EQ, "1 2", 0}, IntegerCase{16, OPER_EQ, "0x10", 0}));

class Request : public testing::Test {
protected:
    SampleManager manager;
    SampleRequest request{nullptr, nullptr, &manager};
};

TEST_F(Request, StartsWithoutRowsAndFilter) {
    FLT1_FILTERINFO entry{};
    EXPECT_EQ(OXA_END_OF_FILTER, request.GetFilterInfo(&entry));
    EXPECT_EQ(0, request.NumDataItems());
    EXPECT_EQ(0, request.NumRowsAllocated());
    EXPECT_EQ(1U, request.AllocationDefault());
    EXPECT_EQ(0, request.Interval());
    EXPECT_EQ(0, request.SampleType());
    EXPECT_STREQ("TST", request.ApplicationName());
    EXPECT_STREQ("SAMPLE", request.TableName());
}

TEST_F(Request, KeepsCopiesOfRowsInOrder) {
    for (int i = 0; i < 10; ++i) {
        SampleRow row = sampleRow("r" + std::to_string(i), i);
        ASSERT_EQ(OXA_OK, request.InsertRow(reinterpret_cast<char*>(&row)));
    }
    ASSERT_EQ(10, request.NumDataItems());
    EXPECT_GE(request.NumRowsAllocated(), 10);
    for (int i = 0; i < 10; ++i) {
        const SampleRow expected = sampleRow("r" + std::to_string(i), i);
        EXPECT_EQ(0, std::memcmp(request.Data(i), &expected, sizeof expected)) << i;
    }
}

TEST_F(Request, MakesRoomForOneRowWhenOneComes) {
    request.add(sampleRow("a", 1));
    EXPECT_EQ(1, request.NumRowsAllocated());
}

TEST_F(Request, MakesRoomForAsManyRowsAsWereAskedFor) {
    request.SetAllocationDefault(16);
    EXPECT_EQ(16U, request.AllocationDefault());
    request.add(sampleRow("a", 1));
    EXPECT_EQ(16, request.NumRowsAllocated());
}

TEST_F(Request, ClearedRowsKeepTheirMemory) {
    request.add(sampleRow("a", 1));
    request.add(sampleRow("b", 2));
    const int allocated = request.NumRowsAllocated();
    request.ClearCount();
    EXPECT_EQ(0, request.NumDataItems());
    EXPECT_EQ(allocated, request.NumRowsAllocated());
    request.add(sampleRow("c", 3));
    EXPECT_EQ(0, std::memcmp(request.Data(0), "c       ", 8));
}

TEST_F(Request, RefusesRowsBeforeTheirSizeIsKnown) {
    request.SetRowSize(0);
    SampleRow row = sampleRow("a", 1);
    EXPECT_EQ(OXA_NO_MEMORY, request.InsertRow(reinterpret_cast<char*>(&row)));
}

TEST_F(Request, SaysWhenMemoryIsShort) {
    request.SetRowSize(0x7FFFFFFF);
    request.SetAllocationDefault(0xFFFFFFFF);
    SampleRow row = sampleRow("a", 1);
    EXPECT_EQ(OXA_NO_MEMORY, request.InsertRow(reinterpret_cast<char*>(&row)));
    EXPECT_EQ(0, request.NumDataItems());
}

TEST_F(Request, WithoutAFilterEveryRowPasses) {
    SampleRow row = sampleRow("a", 1);
    EXPECT_EQ(1, request.CheckForException(reinterpret_cast<char*>(&row)));
}

TEST_F(Request, CountsUsesOfItsOwnHandleOnly) {
    EXPECT_NE(0UL, request.Handle());
    EXPECT_EQ(0U, request.UseCount());
    request.UseHandle(request.Handle());
    request.UseHandle(request.Handle());
    request.UseHandle(request.Handle() + 1);
    EXPECT_EQ(2U, request.UseCount());
    request.Drop();
    request.Drop();
    request.Drop();
    EXPECT_EQ(0U, request.UseCount());
}

TEST_F(Request, EveryObjectHasItsOwnNumber) {
    const SampleRequest other(nullptr, nullptr, &manager);
    EXPECT_NE(other.ObjectNumber(), request.ObjectNumber());
    EXPECT_NE(other.Handle(), request.Handle());
}

TEST_F(Request, APlainQueryDispatchesNothingAndKeepsItsRows) {
    request.add(sampleRow("a", 1));
    EXPECT_EQ(OXA_OK, request.Dispatch());
    EXPECT_EQ(1, request.NumDataItems());
}

/// A table that overrides nothing it need not.
class BareRequest : public rtoxa {
public:
    using rtoxa::rtoxa;
    int TakeSample() override { return OXA_OK; }
};

TEST_F(Request, TheBaseClassKnowsNoColumnAndNoCommand) {
    BareRequest bare(nullptr, nullptr, &manager);
    ColumnInfo info{"untouched", 1, 2, 3};
    char text[] = "x";
    EXPECT_EQ(0, bare.NumColumns());
    EXPECT_EQ(OXA_BAD_COLUMN, bare.GetColumnInfo(&info, 0));
    EXPECT_STREQ("untouched", info.name);
    EXPECT_EQ(OXA_FAILED, bare.ExecuteCommand(text, 1, text));
    EXPECT_EQ(0, bare.ColumnIsException(text, text, OPER_EQ, text));
    bare.CommandCompleted(nullptr);
}

TEST_F(Request, TheBaseClassPrintsItselfAtDetailLevel) {
    BareRequest bare(nullptr, nullptr, &manager);
    const TraceCapture trace;
    bare.PrintSelf();
    ASSERT_EQ(1U, trace.details("oxa").size());
    EXPECT_THAT(
        trace.details("oxa")[0],
        testing::MatchesRegex("rtoxa @0x[0-9a-f]+ <[0-9]+,0> appl=TST,table=SAMPLE,count=0"));
}

TEST_F(Request, TheBaseClassPrintsNothingWhenDetailsAreOff) {
    BareRequest bare(nullptr, nullptr, &manager);
    const TraceCapture trace("ERROR");
    bare.PrintSelf();
    EXPECT_TRUE(trace.lines().empty());
}

TEST(Manager, KnowsItsNames) {
    const SampleManager manager("NAMES");
    EXPECT_STREQ("TST", manager.ApplicationName());
    EXPECT_STREQ("NAMES", manager.TableName());
}

TEST(Manager, WithoutSubscriptionsHasNothingToWalk) {
    SampleManager manager("EMPTY");
    EXPECT_TRUE(manager.liveNumbers().empty());
}

TEST(OriginNode, IsTheHostNameUntilItIsSet) {
    char name[256] = "";
    ASSERT_EQ(0, ::gethostname(name, sizeof name - 1));
    EXPECT_EQ(std::string(name).substr(0, 64), OXA_GetOriginnode(nullptr));
}

TEST(OriginNode, IsCutTo64BytesAndOldNamesStayReadable) {
    oxa::setOriginNode("first");
    const char* const first = OXA_GetOriginnode(nullptr);
    oxa::setOriginNode(std::string(100, 'n'));
    EXPECT_EQ(std::string(64, 'n'), OXA_GetOriginnode(nullptr));
    EXPECT_EQ(std::string(64, 'n'), oxa::originNode());
    EXPECT_STREQ("first", first);
}

}  // namespace
