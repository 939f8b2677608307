// The XML parser, over expat. Where the local code page is UTF-8, texts are passed on as expat
// gives them; elsewhere they are converted first.

#include "platform/xml1.h"

#include <expat.h>

#include <cstddef>
#include <exception>
#include <memory>
#include <new>
#include <string>
#include <string_view>
#include <vector>

#include "xml1/codepage.h"
#include "xml1/errors.h"

struct XML1_PARSER {
    explicit XML1_PARSER(const char* encoding);

    struct Closer {
        void operator()(XML_Parser parser) const { XML_ParserFree(parser); }
    };
    xml1::LocalText local;
    const std::unique_ptr<XML_ParserStruct, Closer> expat;

    XML1_StartHandler start = nullptr;
    XML1_EndHandler end = nullptr;
    XML1_DataHandler data = nullptr;
    void* userData = nullptr;

    const char* buffer = nullptr;      ///< handed out by the last XML1_GetBuffer
    int capacity = 0;                  ///< how many bytes of it may be parsed
    XML_Error error = XML_ERROR_NONE;  ///< of the last call
    bool hasElement = false;           ///< a start tag has been seen
    bool hasFailed = false;            ///< some input was not well-formed
    bool hasEnded = false;             ///< the last piece has been parsed
    bool encodingDecided;
    std::string head;  ///< the first bytes, collected until they tell the encoding

    // Scratch space for converted texts, kept to save allocations.
    std::string text;
    std::vector<std::size_t> offsets;
    std::vector<const char*> pointers;
};

namespace {

XML1_PARSER& parserOf(void* context) {
    return *static_cast<XML1_PARSER*>(context);
}

void XMLCALL startDirect(void* context, const XML_Char* name, const XML_Char** attributes) {
    XML1_PARSER& parser = parserOf(context);
    parser.hasElement = true;
    if (parser.start != nullptr) parser.start(parser.userData, name, attributes);
}

void XMLCALL endDirect(void* context, const XML_Char* name) {
    const XML1_PARSER& parser = parserOf(context);
    parser.end(parser.userData, name);
}

void XMLCALL dataDirect(void* context, const XML_Char* text, int length) {
    const XML1_PARSER& parser = parserOf(context);
    parser.data(parser.userData, text, length);
}

/// Runs an action that may throw inside one of expat's callbacks. An exception stops the parser and
/// becomes its error; the callbacks that expat still makes after that are dropped.
template <typename Action>
void guarded(XML1_PARSER& parser, Action action) {
    if (parser.error != XML_ERROR_NONE) return;
    try {
        action();
    } catch (const std::exception&) {
        parser.error = XML_ERROR_NO_MEMORY;
        XML_StopParser(parser.expat.get(), XML_FALSE);
    }
}

/// Converts a 0-terminated text and appends it to parser.text.
void addText(XML1_PARSER& parser, const char* utf8) {
    parser.offsets.push_back(parser.text.size());
    parser.local.append(utf8, parser.text);
    parser.text += '\0';
}

void XMLCALL startConverted(void* context, const XML_Char* name, const XML_Char** attributes) {
    XML1_PARSER& parser = parserOf(context);
    parser.hasElement = true;
    if (parser.start == nullptr) return;
    guarded(parser, [&] {
        parser.text.clear();
        parser.offsets.clear();
        parser.pointers.clear();
        addText(parser, name);
        for (; *attributes != nullptr; ++attributes)
            addText(parser, *attributes);
        for (const std::size_t offset : parser.offsets) {
            parser.pointers.push_back(parser.text.data() + offset);
        }
        parser.pointers.push_back(nullptr);
        parser.start(parser.userData, parser.pointers[0], parser.pointers.data() + 1);
    });
}

void XMLCALL endConverted(void* context, const XML_Char* name) {
    XML1_PARSER& parser = parserOf(context);
    guarded(parser, [&] {
        parser.text.clear();
        parser.local.append(name, parser.text);
        parser.end(parser.userData, parser.text.c_str());
    });
}

void XMLCALL dataConverted(void* context, const XML_Char* utf8, int length) {
    XML1_PARSER& parser = parserOf(context);
    guarded(parser, [&] {
        parser.text.clear();
        parser.local.append({utf8, static_cast<std::size_t>(length)}, parser.text);
        parser.data(parser.userData, parser.text.data(), static_cast<int>(parser.text.size()));
    });
}

enum class Origin { Unknown, SaysItself, Local };

/// Decides from a document's first bytes who knows its encoding. A byte order mark, an XML
/// declaration or a zero byte (16-bit units) means that the document says it. Anything else was
/// written in the local code page. `isWhole` says that no more bytes will come.
Origin originOf(std::string_view head, bool isWhole) {
    static constexpr std::string_view kMarks[] = {"\xEF\xBB\xBF", "\xFE\xFF", "\xFF\xFE", "<?xml"};
    if (head.substr(0, 2).find('\0') != std::string_view::npos) return Origin::SaysItself;
    for (const std::string_view mark : kMarks) {
        const std::string_view seen = head.substr(0, mark.size());
        if (seen == mark) return Origin::SaysItself;
        if (!isWhole && seen == mark.substr(0, seen.size())) return Origin::Unknown;
    }
    return Origin::Local;
}

/// Passes on one piece of input. A piece without bytes goes through XML_Parse, which takes it at
/// any time; XML_ParseBuffer wants a buffer first, except in some versions of expat.
XML_Status parsePiece(XML1_PARSER& parser, int length, bool isFinal) {
    const XML_Parser expat = parser.expat.get();
    if (length == 0) return XML_Parse(expat, "", 0, isFinal);
    return XML_ParseBuffer(expat, length, isFinal);
}

/// Parses the first pieces. They are collected until they tell the encoding.
XML_Status parseHead(XML1_PARSER& parser, int length, bool isFinal) {
    const XML_Parser expat = parser.expat.get();
    if (length > 0) parser.head.append(parser.buffer, static_cast<std::size_t>(length));
    const Origin origin = originOf(parser.head, isFinal);
    if (origin == Origin::Unknown) return XML_STATUS_OK;
    parser.encodingDecided = true;
    if (origin == Origin::Local) XML_SetEncoding(expat, xml1::kLocalEncoding);
    return XML_Parse(expat, parser.head.data(), static_cast<int>(parser.head.size()), isFinal);
}

/// Whether missing end tags are all that is wrong with the document.
bool endedWithinElement(const XML1_PARSER& parser) {
    return parser.hasElement && parser.error == XML_ERROR_NONE &&
           XML_GetErrorCode(parser.expat.get()) == XML_ERROR_NO_ELEMENTS;
}

/// Parses a piece and keeps the error code, if any. Throws std::bad_alloc.
bool parse(XML1_PARSER& parser, int length, bool isFinal) {
    const XML_Status status = parser.encodingDecided ? parsePiece(parser, length, isFinal)
                                                     : parseHead(parser, length, isFinal);
    if (status == XML_STATUS_OK || endedWithinElement(parser)) return true;
    // An exception in a callback has left its own code.
    if (parser.error == XML_ERROR_NONE) parser.error = XML_GetErrorCode(parser.expat.get());
    return false;
}

}  // namespace

XML1_PARSER::XML1_PARSER(const char* encoding)
    : expat(XML_ParserCreate(encoding)),
      encodingDecided(encoding != nullptr || !local.readsItself()) {
    if (!expat) throw std::bad_alloc();
    XML_SetUnknownEncodingHandler(expat.get(), xml1::describeEncoding, nullptr);
    XML_SetUserData(expat.get(), this);
    XML1_SetElementHandler(this, nullptr, nullptr);
}

XML1_PARSER* XML1_ParserCreate(const char* encoding) {
    try {
        return new XML1_PARSER(encoding);
    } catch (const std::bad_alloc&) {
        return nullptr;
    }
}

void XML1_SetElementHandler(XML1_PARSER* parser, XML1_StartHandler start, XML1_EndHandler end) {
    parser->start = start;
    parser->end = end;
    const bool direct = parser->local.isUtf8();
    // Start tags are always watched: whether there was an element decides how a document may end.
    XML_SetStartElementHandler(parser->expat.get(), direct ? startDirect : startConverted);
    const XML_EndElementHandler forward = direct ? endDirect : endConverted;
    XML_SetEndElementHandler(parser->expat.get(), end != nullptr ? forward : nullptr);
}

void XML1_SetCharacterDataHandler(XML1_PARSER* parser, XML1_DataHandler handler) {
    parser->data = handler;
    const XML_CharacterDataHandler forward = parser->local.isUtf8() ? dataDirect : dataConverted;
    XML_SetCharacterDataHandler(parser->expat.get(), handler != nullptr ? forward : nullptr);
}

void XML1_SetUserData(XML1_PARSER* parser, void* userData) {
    parser->userData = userData;
}

void* XML1_GetBuffer(XML1_PARSER* parser, int length) {
    parser->buffer = nullptr;
    parser->capacity = 0;
    if (length < 0 || parser->hasEnded) {
        parser->error = length < 0 ? XML_ERROR_INVALID_ARGUMENT : XML_ERROR_FINISHED;
        return nullptr;
    }
    // Some versions of expat have no buffer to give for 0 bytes.
    void* const buffer = XML_GetBuffer(parser->expat.get(), length > 0 ? length : 1);
    if (buffer == nullptr) {
        parser->error = XML_GetErrorCode(parser->expat.get());
        return nullptr;
    }
    parser->buffer = static_cast<const char*>(buffer);
    parser->capacity = length;
    return buffer;
}

int XML1_ParseBuffer(XML1_PARSER* parser, int length, int isFinal) {
    if (length < 0 || length > parser->capacity) {
        parser->error = XML_ERROR_INVALID_ARGUMENT;
        return 0;
    }
    if (parser->hasFailed) return 0;
    if (parser->hasEnded) {
        parser->error = XML_ERROR_FINISHED;
        return 0;
    }
    parser->capacity = 0;
    parser->hasEnded = isFinal != 0;
    parser->error = XML_ERROR_NONE;
    try {
        parser->hasFailed = !parse(*parser, length, isFinal != 0);
    } catch (const std::bad_alloc&) {
        parser->error = XML_ERROR_NO_MEMORY;
        parser->hasFailed = true;
    }
    return parser->hasFailed ? 0 : 1;
}

int XML1_GetErrorCode(XML1_PARSER* parser) {
    return parser->error;
}

const char* XML1_ErrorString(int code) {
    return xml1::errorText(code);
}

int XML1_GetCurrentLineNumber(XML1_PARSER* parser) {
    return static_cast<int>(XML_GetCurrentLineNumber(parser->expat.get()));
}

int XML1_GetCurrentColumnNumber(XML1_PARSER* parser) {
    return static_cast<int>(XML_GetCurrentColumnNumber(parser->expat.get()));
}

void XML1_ParserFree(XML1_PARSER* parser) {
    delete parser;
}
