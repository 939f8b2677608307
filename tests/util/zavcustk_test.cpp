// Splitting the RESERVED column.
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "support/trace_capture.h"
#include "util/zavutil.h"

using namespace ZAV;
using ::testing::ElementsAre;

namespace {

class ParseReserved : public ::testing::Test {
protected:
    bool parse(const char* text) {
        return Util::parseReserved(text, values[0], values[1], values[2], values[3], values[4]);
    }
    std::vector<std::string> narrow() const {
        std::vector<std::string> found;
        for (const String& value : values) {
            found.emplace_back(static_cast<const char*>(value.c_str()));
        }
        return found;
    }

    String values[5] = {"1", "2", "3", "4", "5"};
    TraceCapture traces;
};

TEST_F(ParseReserved, GivesLevelsVersionsAndArchitectures) {
    EXPECT_TRUE(parse("A=06.20.00:li6263;C=06.20.00:li6263;G=06.20.00:li6263"));
    EXPECT_THAT(narrow(), ElementsAre("06.20.00", "li6263", "062000", "li6263", "062000"));
    EXPECT_THAT(traces.details("zavcustk"),
                ElementsAre("reserved=[A=06.20.00:li6263;C=06.20.00:li6263;G=06.20.00:li6263]",
                            "agentLevel=06.20.00,agentArch=li6263",
                            "axVersion=062000,axArch=li6263", "commonVersion=062000"));
    EXPECT_THAT(traces.errors(), ElementsAre());
}

TEST_F(ParseReserved, TakesTheEntriesInAnyOrder) {
    EXPECT_TRUE(parse("G=1.2:g;A=3.4:a;C=5.6:c"));
    EXPECT_THAT(narrow(), ElementsAre("3.4", "a", "56", "c", "12"));
}

TEST_F(ParseReserved, RepeatedLetterOverwrites) {
    EXPECT_TRUE(parse("A=1:a;A=2:b;A=3:c"));
    EXPECT_THAT(narrow(), ElementsAre("3", "c", "3", "4", "5"));
}

TEST_F(ParseReserved, RunsOfDelimitersCountAsOne) {
    EXPECT_TRUE(parse(";A==1::a;;C:2=c;G=:3:g;"));
    EXPECT_THAT(narrow(), ElementsAre("1", "a", "2", "c", "3"));
}

TEST_F(ParseReserved, OnlyTheFirstLetterCounts) {
    EXPECT_TRUE(parse("Agent=1:a;Cxx=2:c;Gyy=3:g"));
    EXPECT_THAT(narrow(), ElementsAre("1", "a", "2", "c", "3"));
}

TEST_F(ParseReserved, WrongNumberOfProducts) {
    EXPECT_FALSE(parse("A=1:a;C=2:c"));
    EXPECT_FALSE(parse(""));
    EXPECT_FALSE(parse("A=1:a;C=2:c;G=3:g;A=1:a"));
    EXPECT_THAT(traces.errors("zavcustk"),
                ElementsAre("wrong number of products in RESERVED column:2",
                            "wrong number of products in RESERVED column:0",
                            "wrong number of products in RESERVED column:4"));
    EXPECT_THAT(narrow(), ElementsAre("1", "2", "3", "4", "5"));
}

TEST_F(ParseReserved, WrongNumberOfTokensOfAProduct) {
    EXPECT_FALSE(parse("A=06.20.00;C=1:c;G=1:g"));
    EXPECT_FALSE(parse("C=1:c:d;A=1:a;G=1:g"));
    EXPECT_FALSE(parse("G;A=1:a;C=1:c"));
    EXPECT_THAT(traces.errors("zavcustk"), ElementsAre("wrong number of tokens in A product:2",
                                                       "wrong number of tokens in C product:4",
                                                       "wrong number of tokens in G product:1"));
    EXPECT_THAT(narrow(), ElementsAre("1", "2", "3", "4", "5"));
}

TEST_F(ParseReserved, UnknownProductKeepsWhatCameBefore) {
    EXPECT_FALSE(parse("A=7:a;X=1:x;G=9:g"));
    EXPECT_THAT(traces.errors("zavcustk"), ElementsAre("unknown product in RESERVED column"));
    EXPECT_THAT(narrow(), ElementsAre("7", "a", "3", "4", "5"));
}

TEST_F(ParseReserved, LettersAreCaseSensitive) {
    EXPECT_FALSE(parse("a=1:a;C=1:c;G=1:g"));
    EXPECT_THAT(traces.errors("zavcustk"), ElementsAre("unknown product in RESERVED column"));
}

}  // namespace
