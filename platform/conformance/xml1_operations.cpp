// What xml1.h promises: the XML push parser.

#include "platform/xml1.h"

#include <clocale>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <string>
#include <vector>

#include "conformance/rule.h"
#include "platform/nls2.h"

namespace conformance {
namespace {

using Events = std::vector<std::string>;

constexpr const char* kUtf8Locale = "C.UTF-8";
constexpr const char* kOtherLocale = "C";

void setLocale(const char* name) {
    ::setenv("LC_ALL", name, 1);
    require(std::setlocale(LC_ALL, name) != nullptr, std::string("no locale ") + name);
}

/// Runs a check in a UTF-8 locale and in another one.
void inBothLocales(const std::function<void()>& check) {
    for (const char* const name : {kUtf8Locale, kOtherLocale}) {
        setLocale(name);
        try {
            check();
        } catch (const Unfulfilled& broken) {
            throw Unfulfilled(std::string("in the locale ") + name + ": " + broken.what());
        }
    }
}

/// A parser whose events are written down: "<name k=v", "text", ">name".
class Recorder {
public:
    explicit Recorder(const char* encoding = nullptr) : parser_(XML1_ParserCreate(encoding)) {
        require(parser_ != nullptr, "no parser is made");
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
        require(buffer != nullptr, "there is no buffer");
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

    Events events;

private:
    static void onStart(void* self, const char* name, const char** attributes) {
        std::string event = std::string("<") + name;
        for (; *attributes != nullptr; attributes += 2)
            event += std::string(" ") + attributes[0] + "=" + attributes[1];
        static_cast<Recorder*>(self)->events.push_back(event);
    }
    static void onEnd(void* self, const char* name) {
        static_cast<Recorder*>(self)->events.push_back(std::string(">") + name);
    }
    /// Joins neighbouring pieces of text: where they are split is the parser's affair.
    static void onData(void* self, const char* text, int length) {
        Events& events = static_cast<Recorder*>(self)->events;
        const std::string piece(text, static_cast<std::size_t>(length));
        const bool joins = !events.empty() && events.back()[0] == '"';
        if (joins) events.back() += piece;
        if (!joins) events.push_back('"' + piece);
    }

    XML1_PARSER* const parser_;
};

Events eventsOf(const std::string& document, const char* encoding = nullptr) {
    Recorder recorder(encoding);
    requireEqual(recorder.push(document, true), 1, "the result for " + shown(document));
    return recorder.events;
}

void requireError(const std::string& document) {
    Recorder recorder;
    requireEqual(recorder.push(document, true), 0, "the result for " + shown(document));
    require(XML1_GetErrorCode(recorder.parser()) != 0, "no error code for " + shown(document));
}

/// A text in the code page of the process's default locale.
std::string local(const std::vector<unsigned short>& units) {
    int status = NLS2_OK;
    NLS2_LOCALE* const locale = NLS2_GetLocale(NLS2_BY_DEFAULT, 0, 0, &status);
    require(locale != nullptr, "NLS2 has no default locale");
    std::string out(units.size() * 4, '\0');
    out.resize(NLS2_fromUTF16(locale, units.data(), static_cast<unsigned>(units.size()), out.data(),
                              static_cast<unsigned>(out.size()), &status));
    NLS2_ReleaseLocale(locale);
    return out;
}

// --- Making and setting up --------------------------------------------------------------------

void overridesTheDocumentsEncoding(Bench&) {
    inBothLocales([] {
        requireEqual(eventsOf("<a>\xC3\xA4</a>", "UTF-8"), Events{"<a", "\"" + local({0xE4}), ">a"},
                     "the list of events");
    });
}

void handsElementsOver(Bench&) {
    inBothLocales([] {
        requireEqual(eventsOf("<a x='1' y='2'><b></b><c/></a>"),
                     Events{"<a x=1 y=2", "<b", ">b", "<c", ">c", ">a"}, "the list of events");
    });
}

void letsElementHandlersBeMissing(Bench&) {
    inBothLocales([] {
        Recorder recorder;
        XML1_SetElementHandler(recorder.parser(), nullptr, nullptr);
        requireEqual(recorder.push("<a>t</a>", true), 1, "the result");
        requireEqual(recorder.events, Events{"\"t"}, "the list of events");
    });
}

void handsTextOverInOrder(Bench&) {
    inBothLocales([] {
        requireEqual(eventsOf("<a>t<b>u</b>v &lt; w</a>"),
                     Events{"<a", "\"t", "<b", "\"u", ">b", "\"v < w", ">a"}, "the list of events");
    });
}

void letsTheDataHandlerBeMissing(Bench&) {
    inBothLocales([] {
        Recorder recorder;
        XML1_SetCharacterDataHandler(recorder.parser(), nullptr);
        requireEqual(recorder.push("<a>t</a>", true), 1, "the result");
        requireEqual(recorder.events, Events{"<a", ">a"}, "the list of events");
    });
}

void givesEveryHandlerThePointer(Bench&) {
    setLocale(kUtf8Locale);
    int marks = 0;
    const auto mark = [](void* data, const char*) { ++*static_cast<int*>(data); };
    XML1_PARSER* const parser = XML1_ParserCreate(nullptr);
    XML1_SetElementHandler(
        parser, [](void* data, const char*, const char**) { ++*static_cast<int*>(data); }, mark);
    XML1_SetCharacterDataHandler(parser,
                                 [](void* data, const char*, int) { ++*static_cast<int*>(data); });
    XML1_SetUserData(parser, &marks);
    std::memcpy(XML1_GetBuffer(parser, 8), "<a>t</a>", 8);
    requireEqual(XML1_ParseBuffer(parser, 8, 1), 1, "the result");
    XML1_ParserFree(parser);
    requireEqual(marks, 3, "the number of calls with the pointer");
}

// --- Buffers ----------------------------------------------------------------------------------

void givesABufferForNoBytes(Bench&) {
    setLocale(kUtf8Locale);
    Recorder recorder;
    require(XML1_GetBuffer(recorder.parser(), 0) != nullptr, "there is none");
}

void givesNoBufferOfNegativeLength(Bench&) {
    setLocale(kUtf8Locale);
    Recorder recorder;
    require(XML1_GetBuffer(recorder.parser(), -1) == nullptr, "there is one");
}

void givesNoBufferAfterTheLastPiece(Bench&) {
    setLocale(kUtf8Locale);
    Recorder recorder;
    requireEqual(recorder.push("<a/>", true), 1, "the result");
    require(XML1_GetBuffer(recorder.parser(), 1) == nullptr, "there is one");
}

// --- Parsing ----------------------------------------------------------------------------------

void doesNotCareWhereADocumentIsCut(Bench&) {
    inBothLocales([] {
        for (const std::string head :
             {"", "<?xml version='1.0' encoding='UTF-8'?>", "\xEF\xBB\xBF"}) {
            const std::string document = head + "<a k='\xC3\xA4'>t\xC3\xB6<b/></a>";
            const Events whole = eventsOf(document);
            for (std::size_t size = 1; size <= document.size(); ++size) {
                Recorder recorder;
                requireEqual(recorder.pushInPieces(document, size), 1,
                             "the result for pieces of " + std::to_string(size));
                requireEqual(recorder.events, whole,
                             "the list of events for pieces of " + std::to_string(size));
            }
        }
    });
}

void convertsToTheLocalCodePage(Bench&) {
    inBothLocales([] {
        requireEqual(
            eventsOf("<?xml version='1.0' encoding='UTF-8'?>"
                     "<\xC3\xA4 k='\xC3\xBC'>\xC3\x9F 1\xE2\x82\xAC 2\xF0\x9F\x98\x80</\xC3\xA4>"),
            Events{"<" + local({0xE4}) + " k=" + local({0xFC}),
                   "\"" + local({0xDF, ' ', '1', 0x20AC, ' ', '2', 0xD83D, 0xDE00}),
                   ">" + local({0xE4})},
            "the list of events");
    });
}

void readsOtherEncodings(Bench&) {
    inBothLocales([] {
        const Events expected = {"<a", "\"" + local({0xE4}), ">a"};
        requireEqual(eventsOf("<?xml version='1.0' encoding='ISO-8859-1'?><a>\xE4</a>"), expected,
                     "the list of events in ISO 8859-1");
        requireEqual(eventsOf(std::string("\xFF\xFE<\0a\0>\0\xE4\0<\0/\0a\0>\0", 18)), expected,
                     "the list of events in UTF-16");
        requireEqual(eventsOf("\xEF\xBB\xBF<a>\xC3\xA4</a>"), expected,
                     "the list of events after a byte order mark");
    });
}

void readsUndeclaredTextAsLocal(Bench&) {
    inBothLocales([] {
        const std::string text = local({0xE4});
        requireEqual(eventsOf("<a k='" + text + "'>" + text + "</a>"),
                     Events{"<a k=" + text, "\"" + text, ">a"}, "the list of events");
    });
}

void acceptsADocumentThatEndsWithinAnElement(Bench&) {
    inBothLocales([] {
        requireEqual(eventsOf("<a>t<b>u</b>"), Events{"<a", "\"t", "<b", "\"u", ">b"},
                     "the list of events");
        Recorder cut;
        requireEqual(cut.pushInPieces("<a>t<b>u</b>", 1), 1, "the result byte by byte");
        Recorder deaf;
        XML1_SetElementHandler(deaf.parser(), nullptr, nullptr);
        requireEqual(deaf.push("<a>", true), 1, "the result without handlers");
    });
}

void refusesWhatIsNoDocument(Bench&) {
    inBothLocales([] {
        for (const char* const document :
             {"", "<", "<?x", "<?xml", "\xEF\xBB", "<a", "<a></b>", "<!-- no element -->"})
            requireError(document);
    });
}

void refusesAnUnknownEncoding(Bench&) {
    inBothLocales([] { requireError("<?xml version='1.0' encoding='no-such-code'?><a/>"); });
}

void refusesMoreThanTheBuffer(Bench&) {
    inBothLocales([] {
        Recorder recorder;
        requireEqual(XML1_ParseBuffer(recorder.parser(), 5, 1), 0, "the result without a buffer");
        require(XML1_GetErrorCode(recorder.parser()) != 0, "there is no error code");
        requireEqual(XML1_ParseBuffer(recorder.parser(), -1, 1), 0, "the result for -1 bytes");
    });
}

void takesEmptyPieces(Bench&) {
    inBothLocales([] {
        Recorder recorder;
        requireEqual(XML1_ParseBuffer(recorder.parser(), 0, 0), 1, "the result without a buffer");
        requireEqual(recorder.push("", false), 1, "the result with a buffer");
        requireEqual(recorder.push("<a/>", true), 1, "the result of the rest");
        requireEqual(recorder.events, Events{"<a", ">a"}, "the list of events");
    });
}

void staysEndedAfterTheLastPiece(Bench&) {
    setLocale(kUtf8Locale);
    Recorder recorder;
    requireEqual(recorder.push("<a/>", true), 1, "the result");
    requireEqual(XML1_ParseBuffer(recorder.parser(), 0, 1), 0, "the result of one more piece");
}

void staysWrongAfterAnError(Bench&) {
    inBothLocales([] {
        Recorder recorder;
        requireEqual(recorder.push("<a></b>", true), 0, "the result");
        const int code = XML1_GetErrorCode(recorder.parser());
        requireEqual(XML1_ParseBuffer(recorder.parser(), 0, 1), 0, "the result of one more piece");
        requireEqual(XML1_GetErrorCode(recorder.parser()), code, "the error code afterwards");
    });
}

void boundsEntities(Bench&) {
    setLocale(kUtf8Locale);
    std::string document = "<!DOCTYPE a [<!ENTITY e0 'xxxxxxxxxxxxxxxx'>";
    for (int i = 1; i <= 12; ++i) {
        document += "<!ENTITY e" + std::to_string(i) + " '";
        for (int n = 0; n < 10; ++n)
            document += "&e" + std::to_string(i - 1) + ";";
        document += "'>";
    }
    requireError(document + "]><a>&e12;</a>");
}

void takesThousandsOfAttributes(Bench&) {
    inBothLocales([] {
        std::string document = "<a";
        std::string event = "<a";
        for (int i = 0; i < 5000; ++i) {
            document += " k" + std::to_string(i) + "='v'";
            event += " k" + std::to_string(i) + "=v";
        }
        require(eventsOf(document + "/>") == Events{event, ">a"}, "they do not all arrive");
    });
}

// --- Errors -----------------------------------------------------------------------------------

void hasNoCodeWithoutAnError(Bench&) {
    inBothLocales([] {
        Recorder recorder;
        requireEqual(recorder.push("<a/>", true), 1, "the result");
        requireEqual(XML1_GetErrorCode(recorder.parser()), 0, "the code");
    });
}

void tellsErrorsApart(Bench&) {
    inBothLocales([] {
        Recorder mismatched, empty;
        mismatched.push("<a></b>", true);
        empty.push("", true);
        require(XML1_GetErrorCode(mismatched.parser()) != XML1_GetErrorCode(empty.parser()),
                "a mismatched tag and an empty document have one code");
    });
}

void hasATextForEveryCode(Bench&) {
    inBothLocales([] {
        for (const char* const document : {"", "<a></b>", "<a", "<a b></a>", "x"}) {
            Recorder recorder;
            recorder.push(document, true);
            const char* const text = XML1_ErrorString(XML1_GetErrorCode(recorder.parser()));
            require(text != nullptr && *text != '\0',
                    "no text for the error of " + shown(document));
        }
    });
}

void hasNoTextForOtherCodes(Bench&) {
    for (const int code : {0, -1, 100'000})
        require(XML1_ErrorString(code) == nullptr, "a text for " + std::to_string(code));
}

/// Where the end tag stands that does not match.
Recorder& misled(Recorder& recorder) {
    requireEqual(recorder.push("<a>\n  <b></a>", true), 0, "the result");
    return recorder;
}

void countsLinesFromOne(Bench&) {
    inBothLocales([] {
        Recorder recorder, empty;
        requireEqual(XML1_GetCurrentLineNumber(misled(recorder).parser()), 2, "the error's line");
        empty.push("", true);
        requireEqual(XML1_GetCurrentLineNumber(empty.parser()), 1, "an empty document's line");
    });
}

void countsColumnsFromZero(Bench&) {
    inBothLocales([] {
        Recorder recorder, empty;
        requireEqual(XML1_GetCurrentColumnNumber(misled(recorder).parser()), 7,
                     "the error's column");
        empty.push("", true);
        requireEqual(XML1_GetCurrentColumnNumber(empty.parser()), 0, "an empty document's column");
    });
}

void freesNoParserQuietly(Bench&) {
    XML1_ParserFree(nullptr);
}

}  // namespace

std::vector<Operation> xml1Operations() {
    return {
        {"XML1_ParserCreate",
         {{"lets the caller's encoding override the document's", overridesTheDocumentsEncoding}}},
        {"XML1_SetElementHandler",
         {{"has elements and attributes handed over", handsElementsOver},
          {"takes null handlers", letsElementHandlersBeMissing}}},
        {"XML1_SetCharacterDataHandler",
         {{"has text handed over in its place", handsTextOverInOrder},
          {"takes a null handler", letsTheDataHandlerBeMissing}}},
        {"XML1_SetUserData", {{"reaches every handler", givesEveryHandlerThePointer}}},
        {"XML1_GetBuffer",
         {{"gives a buffer for 0 bytes", givesABufferForNoBytes},
          {"gives none of negative length", givesNoBufferOfNegativeLength},
          {"gives none after the last piece", givesNoBufferAfterTheLastPiece}}},
        {"XML1_ParseBuffer",
         {{"makes the same events wherever a document is cut", doesNotCareWhereADocumentIsCut},
          {"hands texts over in the local code page", convertsToTheLocalCodePage},
          {"reads UTF-16, ISO 8859-1 and marked UTF-8", readsOtherEncodings},
          {"reads a document that declares nothing in the local code page",
           readsUndeclaredTextAsLocal},
          {"accepts a document that ends within an element",
           acceptsADocumentThatEndsWithinAnElement},
          {"refuses what is no document", refusesWhatIsNoDocument},
          {"refuses an unknown encoding", refusesAnUnknownEncoding},
          {"refuses more than the buffer holds", refusesMoreThanTheBuffer},
          {"takes empty pieces, with and without a buffer", takesEmptyPieces},
          {"parses nothing after the last piece", staysEndedAfterTheLastPiece},
          {"parses nothing after an error", staysWrongAfterAnError},
          {"bounds what entities expand to", boundsEntities},
          {"takes thousands of attributes", takesThousandsOfAttributes}}},
        {"XML1_GetErrorCode",
         {{"is 0 when nothing was wrong", hasNoCodeWithoutAnError},
          {"tells errors apart", tellsErrorsApart}}},
        {"XML1_ErrorString",
         {{"has a text for every error", hasATextForEveryCode},
          {"has none for other codes", hasNoTextForOtherCodes}}},
        {"XML1_GetCurrentLineNumber", {{"counts lines from 1", countsLinesFromOne}}},
        {"XML1_GetCurrentColumnNumber", {{"counts columns from 0", countsColumnsFromZero}}},
        {"XML1_ParserFree", {{"ignores null", freesNoParserQuietly}}},
    };
}

}  // namespace conformance
