// Cleaning paths and values that come from scripts and the environment.
#include <gmock/gmock.h>

#include <string>

#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "util/zavutil.h"

using namespace ZAV;
using ::testing::ElementsAre;

namespace {

struct Tested {
    int result;
    std::string cleaned;
};

Tested fsoTest(std::string path) {
    const int result = Util::fso_test(path.data());
    return {result, path.c_str()};
}

TEST(FsoTest, TellsDirectoriesFromOtherThingsAndNothing) {
    const ScratchDir scratch;
    const std::string file = scratch.write("file", "");
    EXPECT_EQ(fsoTest(scratch.path()).result, 0);
    EXPECT_EQ(fsoTest(file).result, 1);
    EXPECT_EQ(fsoTest("/dev/null").result, 1);
    EXPECT_EQ(fsoTest(scratch.path("none")).result, 2);
    EXPECT_EQ(fsoTest("").result, 2);
}

TEST(FsoTest, CleansThePathInPlace) {
    const ScratchDir scratch;
    const std::string dir = scratch.makeDir("opt/java");
    for (const std::string& path : {"\"" + dir + "/\"", "\"" + dir + "\"", "\" \t!\"" + dir + "///",
                                    dir + "\"\"\"", dir + "/\\\\", "\"\n" + dir + "//\""}) {
        const Tested tested = fsoTest(path);
        EXPECT_EQ(tested.result, 0) << path;
        EXPECT_EQ(tested.cleaned, path.find("/\\") == std::string::npos ? dir : dir + "/") << path;
    }
}

TEST(FsoTest, LeavesBlanksThatNoQuoteLeads) {
    EXPECT_EQ(fsoTest(" !/x/").cleaned, " !/x");
}

TEST(FsoTest, LeadingQuoteTakesNoBytesBeyondAscii) {
    EXPECT_EQ(fsoTest("\"\xC3\xA9/").cleaned, "\xC3\xA9");
}

TEST(FsoTest, LeadingQuoteTakesWhatIsBelowTheNumberSign) {
    EXPECT_EQ(fsoTest("\"\x01 !\"#x").cleaned, "#x");
}

TEST(FsoTest, PathOfNothingButWhatIsCleanedAwayIsMissing) {
    for (const char* path : {"/", "///", "\"", "\"\"", "\"  \"", "\\\\", "\"/\""}) {
        const Tested tested = fsoTest(path);
        EXPECT_EQ(tested.result, 2) << path;
        EXPECT_EQ(tested.cleaned, "") << path;
    }
}

std::string stripped(const char* text) {
    String wide(text);
    Util::stripNewlineCharsFromOutput(wide);
    return static_cast<const char*>(wide.c_str());
}

TEST(StripNewlines, KeepsTheFirstLine) {
    EXPECT_EQ(stripped("abc\r\ndef"), "abc");
    EXPECT_EQ(stripped("abc\ndef\r"), "abc");
    EXPECT_EQ(stripped("abc\rdef\n"), "abc");
    EXPECT_EQ(stripped("abc\n"), "abc");
    EXPECT_EQ(stripped("abc"), "abc");
    EXPECT_EQ(stripped("\nabc"), "");
}

TEST(StripNewlines, TracesTheLengths) {
    const TraceCapture traces;
    EXPECT_EQ(stripped("abc\r\ndef"), "abc");
    EXPECT_THAT(traces.details("zavutil"), ElementsAre("before length = 8", "after length = 3"));
}

TEST(StripNewlines, NothingToSearchThrows) {
    EXPECT_THROW(stripped(""), IndexOutOfBoundsException);
    EXPECT_THROW(stripped("\r\nabc"), IndexOutOfBoundsException);
}

}  // namespace
