// Builds the document model from the event parser's events.
#include <climits>
#include <cstdio>
#include <cstring>

#include "base/zavdomp.h"
#include "base/zavtrace.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavdomp"};

constexpr int kParsed = 1;
constexpr int kWholeInput = 1;

MallocedText copyOf(const char* text) {
    return MallocedText(::strdup(text));
}

}  // namespace

DOMParser::DOMParser(const char* xmlText) : parser_(XML1_ParserCreate(nullptr)) {
    Trace trace(traceUnit);
    if (parser_ == nullptr) return;
    XML1_SetElementHandler(parser_.get(), startXMLElement, endXMLElement);
    XML1_SetCharacterDataHandler(parser_.get(), charDataHandler);
    XML1_SetUserData(parser_.get(), this);
    const std::size_t length = std::strlen(xmlText);
    // A text longer than the event parser can count gets no buffer, so parsing fails.
    length_ = length <= INT_MAX ? static_cast<unsigned>(length) : INT_MAX;
    if (length_ == length) buffer_ = XML1_GetBuffer(parser_.get(), static_cast<int>(length));
    if (buffer_ != nullptr) std::memcpy(buffer_, xmlText, length);
}

DOMParser::~DOMParser() {}

int DOMParser::parse() {
    Trace trace(traceUnit);
    if (parser_ == nullptr) return trace.exit(0);
    const int rc = XML1_ParseBuffer(parser_.get(), static_cast<int>(length_), kWholeInput);
    if (failure_) std::rethrow_exception(failure_);
    if (rc != kParsed) {
        setErrorMessage();
        return trace.exit(0);
    }
    if (current_ != nullptr) {
        errorMessage_ = copyOf("incomplete xml");
        return trace.exit(0);
    }
    return trace.exit(root_ != nullptr ? 1 : 0);
}

void DOMParser::setErrorMessage() {
    const int code = XML1_GetErrorCode(parser_.get());
    const char* const reason = XML1_ErrorString(code);
    char message[512];
    if (reason != nullptr) {
        std::snprintf(message, sizeof message, "%d:%d: %s\n",
                      XML1_GetCurrentLineNumber(parser_.get()),
                      XML1_GetCurrentColumnNumber(parser_.get()), reason);
    } else {
        std::snprintf(message, sizeof message, "Unknown error code: %d", code);
    }
    errorMessage_ = copyOf(message);
}

/// Runs the body of a handler. No exception may pass through the event parser: the first one is
/// kept until the parser returns, and the events after it are ignored.
template <typename Action>
void DOMParser::handleEvent(Action action) {
    if (failure_) return;
    try {
        action();
    } catch (...) {
        failure_ = std::current_exception();
    }
}

void DOMParser::startElement(const char* name, const char** atts) {
    auto element = std::make_unique<DOMElement>(name);
    for (const char** pair = atts; pair != nullptr && *pair != nullptr; pair += 2) {
        element->setAttribute(pair[0], pair[1]);
    }
    if (root_ == nullptr) {
        root_ = std::move(element);
        current_ = root_.get();
    } else if (current_ != nullptr) {
        current_->addChild(element.get());
        current_ = element.release();
    }
}

void DOMParser::endElement() {
    if (current_ == nullptr) return;
    current_->setElementText(characterData_.c_str());
    current_ = current_->getParent();
    characterData_.clear();
}

void DOMParser::startXMLElement(void* userData, const char* name, const char** atts) {
    auto& self = *static_cast<DOMParser*>(userData);
    self.handleEvent([&] { self.startElement(name, atts); });
}

void DOMParser::endXMLElement(void* userData, const char* /*name*/) {
    auto& self = *static_cast<DOMParser*>(userData);
    self.handleEvent([&] { self.endElement(); });
}

void DOMParser::charDataHandler(void* userData, const char* text, int len) {
    auto& self = *static_cast<DOMParser*>(userData);
    self.handleEvent([&] {
        if (text != nullptr && len > 0) {
            self.characterData_.append(text, static_cast<std::size_t>(len));
        }
    });
}

}  // namespace ZAV
