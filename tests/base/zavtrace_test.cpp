#include "base/zavtrace.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <climits>

#include "support/trace_capture.h"
#include "support/units.h"

using ZAV::CharStar;
using ZAV::formatTrace;
using ZAV::String;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtrace_test"};

enum Colour { kRed = 3 };

TEST(FormatTrace, PrintsTexts) {
    const String text("wide");
    const CharStar narrowText("narrow");
    EXPECT_EQ(formatTrace("[%s] [%s] [%s] [%s]", {text, narrowText, "plain", std::string("own")}),
              "[wide] [narrow] [plain] [own]");
    EXPECT_EQ(formatTrace("%s", {static_cast<const char*>(nullptr)}), "(null)");
    EXPECT_EQ(formatTrace("%s", {CharStar(static_cast<const char*>(nullptr))}), "(null)");
    EXPECT_EQ(formatTrace("no arguments", {}), "no arguments");
}

TEST(FormatTrace, HasTextsOfAnyLength) {
    const std::string longText(100000, 'x');
    EXPECT_EQ(formatTrace("<%s>", {longText}), "<" + longText + ">");
}

TEST(FormatTrace, KeepsToPrecisionAndWidth) {
    const char unterminated[] = {'a', 'b', 'c'};
    EXPECT_EQ(formatTrace("%.3s", {static_cast<const char*>(unterminated)}), "abc");
    EXPECT_EQ(formatTrace("%.2s", {String("abc")}), "ab");
    EXPECT_EQ(formatTrace("[%5s] [%-5s] [%2s]", {"abc", "abc", "abc"}), "[  abc] [abc  ] [abc]");
    EXPECT_EQ(formatTrace("[%-4.2s]", {"abc"}), "[ab  ]");
    EXPECT_EQ(formatTrace("[%4d] [%-4d] [%04d]", {7, 7, 7}), "[   7] [7   ] [0007]");
}

TEST(FormatTrace, PrintsNumbersOfEveryWidth) {
    EXPECT_EQ(formatTrace("%d %i %u", {-1, 2, 3u}), "-1 2 3");
    EXPECT_EQ(formatTrace("%d", {INT_MIN}), std::to_string(INT_MIN));
    EXPECT_EQ(formatTrace("%ld %lld", {LONG_MIN, LLONG_MIN}),
              std::to_string(LONG_MIN) + " " + std::to_string(LLONG_MIN));
    EXPECT_EQ(formatTrace("%lu", {ULONG_MAX}), std::to_string(ULONG_MAX));
    EXPECT_EQ(formatTrace("%zu", {std::size_t{7}}), "7");
    EXPECT_EQ(formatTrace("%x %X %o", {255, 255u, 8}), "ff FF 10");
    EXPECT_EQ(formatTrace("%x %u", {-1, -1}), "ffffffff 4294967295");
    EXPECT_EQ(formatTrace("%d %d", {true, false}), "1 0");
    EXPECT_EQ(formatTrace("%d", {kRed}), "3");
    EXPECT_EQ(formatTrace("%c%c", {'o', static_cast<unsigned short>('k')}), "ok");
}

TEST(FormatTrace, PrintsPointers) {
    int value = 0;
    char expected[40];
    std::snprintf(expected, sizeof expected, "%p", static_cast<void*>(&value));
    EXPECT_EQ(formatTrace("%p", {static_cast<const void*>(&value)}), expected);
    EXPECT_EQ(formatTrace("%s", {static_cast<const void*>(&value)}), expected);
}

TEST(FormatTrace, CopesWithArgumentsOfAnotherKind) {
    EXPECT_EQ(formatTrace("%s", {42}), "42");
    EXPECT_EQ(formatTrace("%s", {ULLONG_MAX}), std::to_string(ULLONG_MAX));
    EXPECT_EQ(formatTrace("%d", {"text"}), "text");
    EXPECT_EQ(formatTrace("%d", {String("text")}), "text");
    EXPECT_EQ(formatTrace("%s %s", {"one"}), "one %s");
    EXPECT_EQ(formatTrace("%d", {1, 2}), "1");
}

TEST(FormatTrace, WritesUnknownConversionsAsTheyStand) {
    EXPECT_EQ(formatTrace("100%% of %s", {"it"}), "100% of it");
    EXPECT_EQ(formatTrace("%y %s", {"it"}), "%y it");
    EXPECT_EQ(formatTrace("%n %s", {"it"}), "%n it");
    EXPECT_EQ(formatTrace("%*d", {5}), "%*d");
    EXPECT_EQ(formatTrace("at the end %", {5}), "at the end %");
    EXPECT_EQ(formatTrace("%-", {5}), "%-");
}

int traced(int value) {
    Trace trace(traceUnit);
    trace().detail("value is %d", value);
    trace().error("value was %d", value);
    return trace.exit(value);
}

void tracedWithoutResult() {
    const Trace trace(traceUnit);
}

TEST(Trace, WritesEntryLinesAndExit) {
    const TraceCapture capture("ALL");
    traced(-5);
    tracedWithoutResult();
    std::vector<std::string> found;
    for (const TraceLine& line : capture.lines()) {
        EXPECT_EQ(line.unit, "zavtrace_test");
        found.push_back(line.level + (" " + line.function + ": " + line.text));
    }
    EXPECT_EQ(found, (std::vector<std::string>{"F traced: Entry", "D traced: value is -5",
                                               "E traced: value was -5", "F traced: Exit -5",
                                               "F tracedWithoutResult: Entry",
                                               "F tracedWithoutResult: Exit"}));
}

TEST(Trace, LinesStandForTheirPlaces) {
    const TraceCapture capture("ALL");
    traced(1);
    const std::vector<TraceLine> lines = capture.lines();
    ASSERT_EQ(lines.size(), 4u);
    EXPECT_EQ(lines[1].line, lines[0].line + 1);
    EXPECT_EQ(lines[2].line, lines[0].line + 2);
    EXPECT_EQ(lines[3].line, lines[0].line + 3);
}

TEST(Trace, WritesOnlyTheLevelsThatAreOn) {
    {
        const TraceCapture capture("ERROR");
        traced(1);
        ASSERT_EQ(capture.lines().size(), 1u);
        EXPECT_EQ(capture.errors(), std::vector<std::string>{"value was 1"});
    }
    {
        const TraceCapture capture("DETAIL");
        traced(1);
        EXPECT_EQ(capture.details(), std::vector<std::string>{"value is 1"});
        EXPECT_EQ(capture.lines().size(), 2u);
    }
    const TraceCapture capture("ERROR (UNIT:other ALL)");
    traced(1);
    EXPECT_EQ(capture.lines().size(), 1u);
}

TEST(Trace, KeepsErrno) {
    const TraceCapture capture("ALL");
    errno = ENOENT;
    traced(1);
    EXPECT_EQ(errno, ENOENT);
}

TEST(Trace, KeepsTextsApartFromFormats) {
    const TraceCapture capture("ALL");
    const Trace trace(traceUnit);
    trace().error("%s", "100%n of %s");
    EXPECT_EQ(capture.errors(), std::vector<std::string>{"100%n of %s"});
}

}  // namespace
