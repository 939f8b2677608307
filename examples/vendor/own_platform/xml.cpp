// The XML push parser, over expat. Texts are handed over in UTF-8 whatever the locale is: this
// vendor's agents write and read their files in UTF-8 only.

#include <expat.h>

#include <memory>
#include <vector>

#include "platform/xml1.h"

struct XML1_PARSER {
    struct Free {
        void operator()(XML_Parser parser) const { XML_ParserFree(parser); }
    };
    std::unique_ptr<XML_ParserStruct, Free> expat;
    XML1_StartHandler start = nullptr;
    XML1_EndHandler end = nullptr;
    XML1_DataHandler data = nullptr;
    void* userData = nullptr;
    std::vector<char> buffer;
    int capacity = 0;         ///< of the buffer, until it is parsed
    bool hasElement = false;  ///< one has begun
    bool isOver = false;      ///< the last piece was parsed, or something was wrong
    int error = XML_ERROR_NONE;
};

namespace {

XML1_PARSER& parserOf(void* context) {
    return *static_cast<XML1_PARSER*>(context);
}

void XMLCALL onStart(void* context, const XML_Char* name, const XML_Char** attributes) {
    XML1_PARSER& parser = parserOf(context);
    parser.hasElement = true;
    if (parser.start != nullptr) parser.start(parser.userData, name, attributes);
}

void XMLCALL onEnd(void* context, const XML_Char* name) {
    XML1_PARSER& parser = parserOf(context);
    if (parser.end != nullptr) parser.end(parser.userData, name);
}

void XMLCALL onData(void* context, const XML_Char* text, int length) {
    XML1_PARSER& parser = parserOf(context);
    if (parser.data != nullptr) parser.data(parser.userData, text, length);
}

int fail(XML1_PARSER& parser, int error) {
    parser.isOver = true;
    parser.error = error;
    return 0;
}

}  // namespace

XML1_PARSER* XML1_ParserCreate(const char* encoding) {
    auto parser = std::make_unique<XML1_PARSER>();
    parser->expat.reset(XML_ParserCreate(encoding));
    if (!parser->expat) return nullptr;
    XML_SetUserData(parser->expat.get(), parser.get());
    XML_SetElementHandler(parser->expat.get(), onStart, onEnd);
    XML_SetCharacterDataHandler(parser->expat.get(), onData);
    return parser.release();
}

void XML1_SetElementHandler(XML1_PARSER* parser, XML1_StartHandler start, XML1_EndHandler end) {
    parser->start = start;
    parser->end = end;
}

void XML1_SetCharacterDataHandler(XML1_PARSER* parser, XML1_DataHandler handler) {
    parser->data = handler;
}

void XML1_SetUserData(XML1_PARSER* parser, void* userData) {
    parser->userData = userData;
}

void* XML1_GetBuffer(XML1_PARSER* parser, int length) {
    if (length < 0 || parser->isOver) return nullptr;
    parser->capacity = length;
    parser->buffer.resize(static_cast<std::size_t>(length) + 1);  // there is one for 0 bytes too
    return parser->buffer.data();
}

int XML1_ParseBuffer(XML1_PARSER* parser, int length, int isFinal) {
    if (parser->isOver) {
        return fail(*parser, parser->error != 0 ? parser->error : int{XML_ERROR_FINISHED});
    }
    if (length < 0 || length > parser->capacity) return fail(*parser, XML_ERROR_INVALID_ARGUMENT);
    parser->capacity = 0;
    parser->isOver = isFinal != 0;
    const XML_Parser expat = parser->expat.get();
    const char* const text = parser->buffer.empty() ? "" : parser->buffer.data();
    if (XML_Parse(expat, text, length, isFinal != 0 ? 1 : 0) == XML_STATUS_OK) return 1;
    const bool onlyLacksEndTags =
        parser->hasElement && XML_GetErrorCode(expat) == XML_ERROR_NO_ELEMENTS;
    return onlyLacksEndTags ? 1 : fail(*parser, XML_GetErrorCode(expat));
}

int XML1_GetErrorCode(XML1_PARSER* parser) {
    return parser->error;
}

const char* XML1_ErrorString(int code) {
    constexpr int kRange = 64;  // what the enumeration's type can hold for certain
    return code > 0 && code < kRange ? XML_ErrorString(static_cast<XML_Error>(code)) : nullptr;
}

int XML1_GetCurrentLineNumber(XML1_PARSER* parser) {
    return static_cast<int>(XML_GetCurrentLineNumber(parser->expat.get()));
}

int XML1_GetCurrentColumnNumber(XML1_PARSER* parser) {
    return static_cast<int>(XML_GetCurrentColumnNumber(parser->expat.get()));
}

void XML1_ParserFree(XML1_PARSER* parser) {
    const std::unique_ptr<XML1_PARSER> gone(parser);
}
