// The parser over an event parser that behaves as no well-kept one does.
#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <string>

#include "base/zavdomp.h"
#include "platform/xml1.h"

struct XML1_PARSER {
    void* userData = nullptr;
    XML1_StartHandler start = nullptr;
    XML1_EndHandler end = nullptr;
    XML1_DataHandler data = nullptr;
    std::string buffer;
};

namespace {

/// What the event parser of the next test does.
struct Script {
    bool parser = true;  ///< whether there is memory for one
    bool buffer = true;  ///< whether there is memory for its input
    int result = 1;
    int errorCode = 0;
    const char* errorText = nullptr;
    std::function<void(XML1_PARSER&)> events = [](XML1_PARSER&) {};
    /// What happened.
    std::string calls;
    std::string input;
    int living = 0;
};
Script script;

}  // namespace

// These stand in for the platform's.
XML1_PARSER* XML1_ParserCreate(const char* encoding) {
    script.calls += encoding == nullptr ? "create " : "create-with-encoding ";
    if (!script.parser) return nullptr;
    ++script.living;
    return new XML1_PARSER;
}

void XML1_SetElementHandler(XML1_PARSER* parser, XML1_StartHandler start, XML1_EndHandler end) {
    script.calls += "elements ";
    parser->start = start;
    parser->end = end;
}

void XML1_SetCharacterDataHandler(XML1_PARSER* parser, XML1_DataHandler handler) {
    script.calls += "data ";
    parser->data = handler;
}

void XML1_SetUserData(XML1_PARSER* parser, void* userData) {
    script.calls += "user ";
    parser->userData = userData;
}

void* XML1_GetBuffer(XML1_PARSER* parser, int length) {
    script.calls += "buffer:" + std::to_string(length) + " ";
    if (!script.buffer) return nullptr;
    parser->buffer.resize(static_cast<std::size_t>(length));
    return parser->buffer.data();
}

int XML1_ParseBuffer(XML1_PARSER* parser, int length, int isFinal) {
    script.calls += "parse:" + std::to_string(length) + ":" + std::to_string(isFinal) + " ";
    script.input = parser->buffer;
    script.events(*parser);
    return script.result;
}

int XML1_GetErrorCode(XML1_PARSER*) {
    return script.errorCode;
}

const char* XML1_ErrorString(int) {
    return script.errorText;
}

int XML1_GetCurrentLineNumber(XML1_PARSER*) {
    return 12;
}

int XML1_GetCurrentColumnNumber(XML1_PARSER*) {
    return 34;
}

void XML1_ParserFree(XML1_PARSER* parser) {
    if (parser != nullptr) --script.living;
    delete parser;
}

using namespace ZAV;

namespace {

class ParserFaults : public ::testing::Test {
protected:
    ParserFaults() { script = Script(); }
    ~ParserFaults() override { EXPECT_EQ(script.living, 0); }
};

const char* kNoAttributes[] = {nullptr};

TEST_F(ParserFaults, WholeTextIsParsedAsOneFinalBuffer) {
    DOMParser parser("<a/>");
    EXPECT_EQ(parser.parse(), 0);
    EXPECT_EQ(script.calls, "create elements data user buffer:4 parse:4:1 ");
    EXPECT_EQ(script.input, "<a/>");
}

TEST_F(ParserFaults, SuccessWithoutAnElementGivesNoMessage) {
    DOMParser parser("x");
    EXPECT_EQ(parser.parse(), 0);
    EXPECT_EQ(parser.getErrorMessage(), nullptr);
    EXPECT_EQ(parser.getDocument(), nullptr);
}

TEST_F(ParserFaults, ElementLeftOpenIsIncomplete) {
    script.events = [](XML1_PARSER& parser) {
        parser.start(parser.userData, "a", kNoAttributes);
        parser.start(parser.userData, "b", kNoAttributes);
        parser.end(parser.userData, "b");
    };
    DOMParser parser("x");
    EXPECT_EQ(parser.parse(), 0);
    EXPECT_STREQ(parser.getErrorMessage(), "incomplete xml");
}

TEST_F(ParserFaults, MessageHasLineColumnAndText) {
    script.result = 0;
    script.errorText = "it broke";
    DOMParser parser("x");
    EXPECT_EQ(parser.parse(), 0);
    EXPECT_STREQ(parser.getErrorMessage(), "12:34: it broke\n");
}

TEST_F(ParserFaults, MessageOfAnUnknownErrorHasItsCode) {
    script.result = 0;
    script.errorCode = 77;
    DOMParser parser("x");
    EXPECT_EQ(parser.parse(), 0);
    EXPECT_STREQ(parser.getErrorMessage(), "Unknown error code: 77");
}

TEST_F(ParserFaults, MessageIsCutTo511Bytes) {
    script.result = 0;
    const std::string longText(2000, 'x');
    script.errorText = longText.c_str();
    DOMParser parser("x");
    EXPECT_EQ(parser.parse(), 0);
    EXPECT_EQ(parser.getErrorMessage(), ("12:34: " + longText).substr(0, 511));
}

TEST_F(ParserFaults, OnlyOneIsSuccess) {
    script.result = 2;
    script.events = [](XML1_PARSER& parser) {
        parser.start(parser.userData, "a", kNoAttributes);
        parser.end(parser.userData, "a");
    };
    DOMParser parser("x");
    EXPECT_EQ(parser.parse(), 0);
    EXPECT_STREQ(parser.getErrorMessage(), "Unknown error code: 0");
}

TEST_F(ParserFaults, WithoutABufferNothingIsCopied) {
    script.buffer = false;
    script.result = 0;
    script.errorText = "out of memory";
    DOMParser parser("<a/>");
    EXPECT_EQ(parser.parse(), 0);
    EXPECT_EQ(script.calls, "create elements data user buffer:4 parse:4:1 ");
    EXPECT_EQ(script.input, "");
    EXPECT_STREQ(parser.getErrorMessage(), "12:34: out of memory\n");
}

TEST_F(ParserFaults, WithoutAnEventParserNothingIsParsed) {
    script.parser = false;
    DOMParser parser("<a/>");
    EXPECT_EQ(parser.parse(), 0);
    EXPECT_EQ(script.calls, "create ");
    EXPECT_EQ(parser.getDocument(), nullptr);
    EXPECT_EQ(parser.getErrorMessage(), nullptr);
}

TEST_F(ParserFaults, EventsOutsideTheRootChangeNothing) {
    script.events = [](XML1_PARSER& parser) {
        parser.end(parser.userData, "x");
        parser.start(parser.userData, "a", kNoAttributes);
        parser.data(parser.userData, "text", 2);
        parser.end(parser.userData, "a");
        parser.start(parser.userData, "b", kNoAttributes);
        parser.end(parser.userData, "b");
        parser.end(parser.userData, "c");
    };
    DOMParser parser("x");
    EXPECT_EQ(parser.parse(), 1);
    String out;
    parser.getDocument()->dump(out);
    EXPECT_STREQ(out.c_str(), "<a >\n</a>");
    EXPECT_TRUE(String(parser.getDocument()->getElementText()) == "te");
}

TEST_F(ParserFaults, TextIsCutAtItsLength) {
    script.events = [](XML1_PARSER& parser) {
        parser.start(parser.userData, "a", kNoAttributes);
        for (const char* piece : {"one|", "two|", "three|"}) {
            parser.data(parser.userData, piece, 3);
        }
        parser.data(parser.userData, nullptr, 0);
        parser.end(parser.userData, "a");
    };
    DOMParser parser("x");
    ASSERT_EQ(parser.parse(), 1);
    EXPECT_TRUE(String(parser.getDocument()->getElementText()) == "onetwothr");
}

}  // namespace
