// Property files.
#include "base/zavrbndl.h"

#include <gmock/gmock.h>
#include <sys/stat.h>

#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include "support/scratch_dir.h"
#include "support/trace_capture.h"

using namespace ZAV;
using ::testing::ElementsAre;
using ::testing::UnorderedElementsAre;

namespace {

class Bundle : public ::testing::Test {
protected:
    ResourceBundle load(const std::string& content, char commentChar = '*') const {
        return ResourceBundle(scratch.write("bundle", content).c_str(), commentChar);
    }
    static std::string value(const ResourceBundle& bundle, const char* key) {
        const String* const found = bundle.getValue(key);
        return found == nullptr ? "(null)" : static_cast<const char*>(found->c_str());
    }
    static std::vector<std::string> keys(const ResourceBundle& bundle) {
        Array<String> found = bundle.getKeys();
        std::vector<std::string> narrow;
        for (unsigned i = 0; i < found.getSize(); ++i) {
            narrow.emplace_back(static_cast<const char*>(found[i].c_str()));
        }
        return narrow;
    }

    ScratchDir scratch;
};

TEST_F(Bundle, HoldsTheFilesPairs) {
    const ResourceBundle bundle = load("A=1\nB=two\n");
    EXPECT_EQ(value(bundle, "A"), "1");
    EXPECT_EQ(value(bundle, "B"), "two");
    EXPECT_THAT(keys(bundle), UnorderedElementsAre("A", "B"));
}

TEST_F(Bundle, AbsentKeyHasNoValue) {
    const ResourceBundle bundle = load("A=1\n");
    EXPECT_EQ(bundle.getValue("B"), nullptr);
    EXPECT_EQ(bundle.getValue("a"), nullptr);
    EXPECT_EQ(bundle.getValue(""), nullptr);
}

TEST_F(Bundle, LineEndsOfEitherKindGiveTheSame) {
    const std::string unixText = "A=1\n\nB = 2 \n*C=3\nD=4";
    std::string dosText;
    for (const char c : unixText)
        dosText += c == '\n' ? "\r\n" : std::string(1, c);
    for (const std::string& text : {unixText, dosText}) {
        const ResourceBundle bundle = load(text);
        EXPECT_THAT(keys(bundle), UnorderedElementsAre("A", "B", "D"));
        EXPECT_EQ(value(bundle, "A"), "1");
        EXPECT_EQ(value(bundle, "B"), "2");
        EXPECT_EQ(value(bundle, "D"), "4");
    }
}

TEST_F(Bundle, CarriageReturnOnItsOwnIsText) {
    const ResourceBundle bundle = load("A=1\rB=2\nC=3\r\r\nD=4\r");
    EXPECT_EQ(value(bundle, "A"), "1\rB=2");
    EXPECT_EQ(value(bundle, "C"), "3");
    EXPECT_EQ(value(bundle, "D"), "4");
    EXPECT_EQ(bundle.getValue("B"), nullptr);
}

TEST_F(Bundle, OnlyTheFirstEqualsSignSplits) {
    const ResourceBundle bundle = load("key = a=b = c \n");
    EXPECT_EQ(value(bundle, "key"), "a=b = c");
}

TEST_F(Bundle, CommentIsToldByTheVeryFirstByte) {
    const ResourceBundle bundle = load("*A=1\n *B=2\n#C=3\n");
    EXPECT_EQ(bundle.getValue("A"), nullptr);
    EXPECT_EQ(value(bundle, "*B"), "2");
    EXPECT_EQ(value(bundle, "#C"), "3");
    EXPECT_EQ(load("#C=3\n", '#').getValue("C"), nullptr);
}

TEST_F(Bundle, LinesWithoutAnEqualsSignAreSkippedSilently) {
    const ZAV::String firstConversion("x");  // which traces the code page
    const TraceCapture traces;
    const ResourceBundle bundle = load("\n\nA\n \nB=1\n\n");
    EXPECT_THAT(keys(bundle), ElementsAre("B"));
    EXPECT_THAT(traces.errors(), ElementsAre());
    EXPECT_THAT(traces.details(), ElementsAre());
}

TEST_F(Bundle, KeysAndValuesMayBeEmpty) {
    const ResourceBundle bundle = load("=only value\nonly key=\n \t = \t \n");
    EXPECT_EQ(value(bundle, ""), "");
    EXPECT_EQ(value(bundle, "only key"), "");
    EXPECT_EQ(keys(bundle).size(), 2u);
}

TEST_F(Bundle, LastLineNeedsNoLineEnd) {
    EXPECT_EQ(value(load("A=1\nB=2"), "B"), "2");
    EXPECT_EQ(value(load("B=2"), "B"), "2");
}

TEST_F(Bundle, LaterLineReplacesTheEarlierOne) {
    const ResourceBundle bundle = load("A=1\nB=2\nA=3\n");
    EXPECT_EQ(value(bundle, "A"), "3");
    EXPECT_EQ(keys(bundle).size(), 2u);
}

TEST_F(Bundle, EmptyFileIsAnEmptyBundle) {
    EXPECT_THAT(keys(load("")), ElementsAre());
    EXPECT_THAT(keys(load("\n")), ElementsAre());
}

TEST_F(Bundle, UnreadableFileThrows) {
    const std::string path = scratch.path("none");
    try {
        ResourceBundle bundle(path.c_str(), '*');
        FAIL() << "no exception";
    } catch (const ResourceBundleException& failure) {
        const ResourceBundleException copy(failure);
        EXPECT_STREQ(copy.getErrorMessage().c_str(), ("Unable to read file: " + path).c_str());
    }
    EXPECT_THROW(ResourceBundle(scratch.path().c_str(), '*'), ResourceBundleException);
}

TEST_F(Bundle, PipeThrowsAtOnce) {
    const std::string pipe = scratch.path("pipe");
    ASSERT_EQ(::mkfifo(pipe.c_str(), 0600), 0);
    EXPECT_THROW(ResourceBundle(pipe.c_str(), '*'), ResourceBundleException);
}

TEST_F(Bundle, CopySharesTheValuesAndOutlivesItsSource) {
    auto original = std::make_unique<ResourceBundle>(load("A=1\nB=2\nA=3\n"));
    auto copy = std::make_unique<ResourceBundle>(*original);
    EXPECT_EQ(copy->getValue("A"), original->getValue("A"));
    original.reset();
    EXPECT_EQ(value(*copy, "A"), "3");
    const ResourceBundle another(*copy);
    copy.reset();
    EXPECT_EQ(value(another, "B"), "2");
}

TEST_F(Bundle, FreeFunctionDeletesAValue) {
    freeValueFunc(new String("x"));
    freeValueFunc(nullptr);
}

}  // namespace
