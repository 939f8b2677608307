// The XML parser, over expat. Where the local code page is UTF-8, each event's texts are handed
// over as they come; elsewhere they are converted on the way.

#include "platform/xml1.h"

#include <expat.h>

#include <cstring>
#include <exception>
#include <string>
#include <string_view>
#include <vector>

#include "xml1/codepage.h"

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

    const char* buffer = nullptr;      ///< that was handed out last
    int capacity = 0;                  ///< of that buffer
    XML_Error error = XML_ERROR_NONE;  ///< an error that expat was not asked about
    bool hasElement = false;           ///< one has begun
    bool encodingDecided;
    std::string head;  ///< the first bytes, until they decide about the encoding

    // Kept for their memory:
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

/// Runs what may throw inside one of expat's callbacks; a failure ends the parsing.
template <typename Action>
void guarded(XML1_PARSER& parser, Action action) {
    try {
        action();
    } catch (const std::exception&) {
        parser.error = XML_ERROR_NO_MEMORY;
        XML_StopParser(parser.expat.get(), XML_FALSE);
    }
}

/// Converts a 0-terminated text behind those that are there already.
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

/// What a document's first bytes say of its encoding: one with a byte order mark, a declaration or
/// a 0 in front (16-bit units) says itself; any other was written in the local code page.
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

/// Parses the first pieces, which are kept until they say what encoding they are in.
XML_Status parseHead(XML1_PARSER& parser, int length, bool isFinal) {
    const XML_Parser expat = parser.expat.get();
    if (length > 0) parser.head.append(parser.buffer, static_cast<std::size_t>(length));
    const Origin origin = originOf(parser.head, isFinal);
    if (origin == Origin::Unknown) return XML_STATUS_OK;
    parser.encodingDecided = true;
    if (origin == Origin::Local) XML_SetEncoding(expat, xml1::kLocalEncoding);
    return XML_Parse(expat, parser.head.data(), static_cast<int>(parser.head.size()),
                     isFinal ? XML_TRUE : XML_FALSE);
}

/// Whether all that is wrong with a document is that end tags are missing.
bool endedWithinElement(const XML1_PARSER& parser) {
    return parser.hasElement && parser.error == XML_ERROR_NONE &&
           XML_GetErrorCode(parser.expat.get()) == XML_ERROR_NO_ELEMENTS;
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
    // The start is always listened to: whether there was an element decides how a document may end.
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
    void* const buffer = XML_GetBuffer(parser->expat.get(), length);
    parser->buffer = static_cast<const char*>(buffer);
    parser->capacity = buffer != nullptr ? length : 0;
    return buffer;
}

int XML1_ParseBuffer(XML1_PARSER* parser, int length, int isFinal) {
    if (length < 0 || length > parser->capacity) {
        parser->error = XML_ERROR_INVALID_ARGUMENT;
        return 0;
    }
    try {
        const XML_Status status =
            parser->encodingDecided
                ? XML_ParseBuffer(parser->expat.get(), length, isFinal != 0 ? 1 : 0)
                : parseHead(*parser, length, isFinal != 0);
        parser->capacity = 0;
        return status == XML_STATUS_OK || endedWithinElement(*parser) ? 1 : 0;
    } catch (const std::bad_alloc&) {
        parser->error = XML_ERROR_NO_MEMORY;
        return 0;
    }
}

int XML1_GetErrorCode(XML1_PARSER* parser) {
    if (parser->error != XML_ERROR_NONE) return parser->error;
    return XML_GetErrorCode(parser->expat.get());
}

const char* XML1_ErrorString(int code) {
    constexpr int kRange = 64;  // what the enumeration's type can hold for certain
    return code >= 0 && code < kRange ? XML_ErrorString(static_cast<XML_Error>(code)) : nullptr;
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
