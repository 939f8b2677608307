#include "platform/xml1.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <clocale>
#include <cstdlib>
#include <cstring>
#include <set>
#include <string>
#include <vector>

namespace {

using testing::ElementsAre;

/// Chooses the code page of the process's locale for one test.
class Locale {
public:
    explicit Locale(const char* name) {
        ::setenv("LC_ALL", name, 1);
        EXPECT_NE(std::setlocale(LC_ALL, name), nullptr);
    }
    ~Locale() {
        ::unsetenv("LC_ALL");
        std::setlocale(LC_ALL, "C");
    }
    Locale(const Locale&) = delete;
    Locale& operator=(const Locale&) = delete;
};

constexpr const char* kUtf8 = "C.UTF-8";
constexpr const char* kLatin1 = "C";  // bytes above 127 are taken as ISO 8859-1

/// A parser whose events are written down: "<name k=v", "text", ">name".
class Recorder {
public:
    explicit Recorder(const char* encoding = nullptr) : parser_(XML1_ParserCreate(encoding)) {
        XML1_SetElementHandler(parser_, onStart, onEnd);
        XML1_SetCharacterDataHandler(parser_, onData);
        XML1_SetUserData(parser_, this);
    }
    ~Recorder() { XML1_ParserFree(parser_); }
    Recorder(const Recorder&) = delete;
    Recorder& operator=(const Recorder&) = delete;

    int push(const std::string& piece, bool isFinal) {
        const int length = static_cast<int>(piece.size());
        void* const buffer = XML1_GetBuffer(parser_, length);
        if (length > 0) std::memcpy(buffer, piece.data(), piece.size());
        return XML1_ParseBuffer(parser_, length, isFinal ? 1 : 0);
    }
    int pushInPieces(const std::string& text, std::size_t size) {
        for (std::size_t at = 0; at < text.size(); at += size) {
            if (push(text.substr(at, size), false) != 1) return 0;
        }
        return push("", true);
    }
    XML1_PARSER* parser() { return parser_; }

    std::vector<std::string> events;

private:
    static void onStart(void* self, const char* name, const char** attributes) {
        std::string event = std::string("<") + name;
        for (; *attributes != nullptr; attributes += 2) {
            event += std::string(" ") + attributes[0] + "=" + attributes[1];
        }
        static_cast<Recorder*>(self)->events.push_back(event);
    }
    static void onEnd(void* self, const char* name) {
        static_cast<Recorder*>(self)->events.push_back(std::string(">") + name);
    }
    /// Neighbouring pieces of text are joined: where they are split is the parser's affair.
    static void onData(void* self, const char* text, int length) {
        std::vector<std::string>& events = static_cast<Recorder*>(self)->events;
        const std::string piece(text, static_cast<std::size_t>(length));
        const bool joins = !events.empty() && events.back()[0] == '"';
        if (joins) events.back() += piece;
        if (!joins) events.push_back('"' + piece);
    }

    XML1_PARSER* const parser_;
};

std::vector<std::string> eventsOf(const std::string& document) {
    Recorder recorder;
    EXPECT_EQ(recorder.push(document, true), 1) << document;
    return recorder.events;
}

TEST(Xml, WhatTheCodePageLacksBecomesAQuestionMark) {
    const Locale locale(kLatin1);
    EXPECT_THAT(
        eventsOf("<?xml version='1.0' encoding='UTF-8'?><a>1\xE2\x82\xAC 2\xF0\x9F\x98\x80</a>"),
        ElementsAre("<a", "\"1? 2?", ">a"));
}

TEST(Xml, EncodingsOfTheCLibraryAreUnderstood) {
    const Locale locale(kUtf8);
    EXPECT_THAT(eventsOf("<?xml version='1.0' encoding='windows-1252'?><a>\x80</a>"),
                ElementsAre("<a", "\"\xE2\x82\xAC", ">a"));
    EXPECT_THAT(eventsOf("<?xml version='1.0' encoding='Shift_JIS'?><a>\x93\xFA\xB1</a>"),
                ElementsAre("<a", "\"\xE6\x97\xA5\xEF\xBD\xB1", ">a"));
    EXPECT_THAT(eventsOf("<?xml version='1.0' encoding='EUC-JP'?><a>\xC6\xFC\x8F\xB0\xA1</a>"),
                ElementsAre("<a", "\"\xE6\x97\xA5\xE4\xB8\x82", ">a"));
}

TEST(Xml, ACharacterOfSeveralBytesMayBeCutBetweenPieces) {
    const Locale locale(kUtf8);
    Recorder recorder;
    const std::string document =
        "<?xml version='1.0' encoding='EUC-JP'?><a>\xC6\xFC\x8F\xB0\xA1</a>";
    EXPECT_EQ(recorder.pushInPieces(document, 1), 1);
    EXPECT_THAT(recorder.events, ElementsAre("<a", "\"\xE6\x97\xA5\xE4\xB8\x82", ">a"));
}

TEST(Xml, AnUnknownEncodingIsAnError) {
    const Locale locale(kUtf8);
    Recorder recorder;
    EXPECT_EQ(recorder.push("<?xml version='1.0' encoding='no-such-code'?><a/>", true), 0);
    EXPECT_STREQ(XML1_ErrorString(XML1_GetErrorCode(recorder.parser())), "unknown encoding");
}

TEST(Xml, AnErrorHasACodeATextAndAPlace) {
    for (const char* const name : {kUtf8, kLatin1}) {
        const Locale locale(name);
        Recorder recorder;
        EXPECT_EQ(recorder.push("<a>\n  <b></a>", true), 0);
        EXPECT_STREQ(XML1_ErrorString(XML1_GetErrorCode(recorder.parser())), "mismatched tag");
        EXPECT_EQ(XML1_GetCurrentLineNumber(recorder.parser()), 2);
        EXPECT_EQ(XML1_GetCurrentColumnNumber(recorder.parser()), 7);
    }
}

TEST(Xml, EveryErrorHasItsOwnText) {
    EXPECT_STREQ(XML1_ErrorString(1), "out of memory");
    EXPECT_STREQ(XML1_ErrorString(7), "mismatched tag");
    EXPECT_STREQ(XML1_ErrorString(43),
                 "limit on input amplification factor (from DTD and entities) breached");
    std::set<std::string> texts;
    for (int code = 1; code <= 43; ++code) {
        ASSERT_NE(XML1_ErrorString(code), nullptr) << code;
        EXPECT_TRUE(texts.insert(XML1_ErrorString(code)).second) << code;
    }
    EXPECT_EQ(XML1_ErrorString(44), nullptr);
}

TEST(Xml, AnEmptyDocumentIsAnError) {
    for (const char* const name : {kUtf8, kLatin1}) {
        const Locale locale(name);
        Recorder recorder;
        EXPECT_EQ(recorder.push("", true), 0);
        EXPECT_STREQ(XML1_ErrorString(XML1_GetErrorCode(recorder.parser())), "no element found");
        EXPECT_EQ(XML1_GetCurrentLineNumber(recorder.parser()), 1);
        EXPECT_EQ(XML1_GetCurrentColumnNumber(recorder.parser()), 0);
    }
}

TEST(Xml, AnEmptyPieceNeedsNoBuffer) {
    for (const char* const name : {kUtf8, kLatin1}) {
        const Locale locale(name);
        Recorder recorder;
        EXPECT_EQ(XML1_ParseBuffer(recorder.parser(), 0, 0), 1);
        EXPECT_EQ(XML1_ParseBuffer(recorder.parser(), 0, 1), 0);
        EXPECT_STREQ(XML1_ErrorString(XML1_GetErrorCode(recorder.parser())), "no element found");
        Recorder whole;
        EXPECT_EQ(whole.push("<a/>", false), 1);
        EXPECT_EQ(XML1_ParseBuffer(whole.parser(), 0, 1), 1);
    }
}

TEST(Xml, NothingIsParsedAfterTheLastPiece) {
    for (const std::string document : {"<a/>", "<a>"}) {
        const Locale locale(kUtf8);
        Recorder recorder;
        EXPECT_EQ(recorder.push(document, true), 1);
        EXPECT_EQ(XML1_GetErrorCode(recorder.parser()), 0) << document;
        const std::size_t events = recorder.events.size();
        EXPECT_EQ(XML1_GetBuffer(recorder.parser(), 1), nullptr) << document;
        EXPECT_EQ(XML1_ParseBuffer(recorder.parser(), 0, 1), 0) << document;
        EXPECT_STREQ(XML1_ErrorString(XML1_GetErrorCode(recorder.parser())), "parsing finished");
        EXPECT_EQ(recorder.events.size(), events);
    }
}

TEST(Xml, AnErrorStaysWhenMoreIsPushed) {
    for (const char* const name : {kUtf8, kLatin1}) {
        const Locale locale(name);
        Recorder recorder;
        EXPECT_EQ(recorder.push("<a></b>", true), 0);
        EXPECT_EQ(XML1_ParseBuffer(recorder.parser(), 0, 1), 0);
        EXPECT_STREQ(XML1_ErrorString(XML1_GetErrorCode(recorder.parser())), "mismatched tag");
        EXPECT_THAT(recorder.events, ElementsAre("<a"));
    }
}

TEST(Xml, ExpandingEntitiesIsBounded) {
    const Locale locale(kUtf8);
    std::string document = "<!DOCTYPE a [<!ENTITY e0 'xxxxxxxxxxxxxxxx'>";
    for (int i = 1; i <= 12; ++i) {
        document += "<!ENTITY e" + std::to_string(i) + " '";
        for (int n = 0; n < 10; ++n)
            document += "&e" + std::to_string(i - 1) + ";";
        document += "'>";
    }
    Recorder recorder;
    EXPECT_EQ(recorder.push(document + "]><a>&e12;</a>", true), 0);
    EXPECT_THAT(XML1_ErrorString(XML1_GetErrorCode(recorder.parser())),
                testing::HasSubstr("amplification"));
}

TEST(Xml, ThousandsOfAttributesArriveInAnotherCodePage) {
    const Locale locale(kLatin1);
    std::string document = "<a";
    for (int i = 0; i < 5000; ++i)
        document += " k" + std::to_string(i) + "='\xE4'";
    const std::vector<std::string> events = eventsOf(document + "/>");
    ASSERT_EQ(events.size(), 2U);
    EXPECT_THAT(events[0], testing::EndsWith(" k4999=\xE4"));
}

}  // namespace
