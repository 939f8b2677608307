// The document model against the event parser alone: both accept the same documents, and every
// event has its node. Done again in a locale whose code page the texts have to be converted to.

#include <expat.h>

#include <clocale>
#include <vector>

#include "base/zavdomp.h"
#include "support/fuzz_support.h"

using fuzz::require;
using namespace ZAV;

namespace {

struct Counts {
    std::size_t elements = 0;
    std::size_t attributes = 0;
};

void XMLCALL countElement(void* userData, const XML_Char*, const XML_Char** attributes) {
    auto& counts = *static_cast<Counts*>(userData);
    ++counts.elements;
    for (; *attributes != nullptr; attributes += 2)
        ++counts.attributes;
}

/// The error code of the event parser on its own.
XML_Error parseAlone(const std::string& text, Counts& counts) {
    const XML_Parser parser = XML_ParserCreate(nullptr);
    XML_SetUserData(parser, &counts);
    XML_SetElementHandler(parser, countElement, nullptr);
    XML_Parse(parser, text.data(), static_cast<int>(text.size()), XML_TRUE);
    const XML_Error error = XML_GetErrorCode(parser);
    XML_ParserFree(parser);
    return error;
}

/// The searches agree with the lists that they search. Searching every element for every tag would
/// be quadratic in the children, so the last child's stands for all.
void checkSearches(const DOMElement& element) {
    const std::vector<DOMNode*>& children = element.getChildren()->nodes();
    if (!children.empty()) {
        const auto* const last = static_cast<const DOMElement*>(children.back());
        const DOMNodeList* const found = element.getElementsByTagName(last->getTagName());
        std::size_t expected = 0;
        for (const DOMNode* child : children) {
            const auto* const tag = static_cast<const DOMElement*>(child)->getTagName();
            if (String::compare(tag, last->getTagName()) == 0) ++expected;
        }
        require(found->getLength() == expected, "a search finds every child of the tag name");
        require(found->item(found->getLength() - 1) == last, "a search keeps the order");
    }
    for (const DOMNode* node : element.getAttributes()->nodes()) {
        const auto* const attribute = static_cast<const DOMAttr*>(node);
        require(element.getAttribute(attribute->getName()) != nullptr, "attributes are found");
    }
}

Counts checkTree(const DOMElement& root) {
    Counts counts;
    std::vector<const DOMElement*> pending = {&root};
    while (!pending.empty()) {
        const DOMElement& element = *pending.back();
        pending.pop_back();
        ++counts.elements;
        counts.attributes += element.getAttributes()->getLength();
        require(element.getTagName() != nullptr, "elements have a tag name");
        checkSearches(element);
        for (const DOMNode* node : element.getChildren()->nodes()) {
            require(node->getNodeType() == DOMNode::ELEMENT_NODE, "children are elements");
            const auto* const child = static_cast<const DOMElement*>(node);
            require(child->getParent() == &element, "children know their parent");
            pending.push_back(child);
        }
    }
    return counts;
}

/// Switches the process's locale while it exists.
class PlainLocale {
public:
    PlainLocale() { std::setlocale(LC_ALL, "C"); }
    ~PlainLocale() { std::setlocale(LC_ALL, "C.UTF-8"); }
    PlainLocale(const PlainLocale&) = delete;
    PlainLocale& operator=(const PlainLocale&) = delete;
};

/// What a parse gave, and all of the tree but its texts.
struct Outcome {
    bool parsed = false;
    Counts counts;
    std::u16string dump;
};

Outcome parse(const std::string& text) {
    DOMParser parser(text.c_str());
    Outcome outcome;
    outcome.parsed = parser.parse() == 1;
    require(outcome.parsed == (parser.getErrorMessage() == nullptr), "a refusal has a message");
    require(!outcome.parsed || parser.getDocument() != nullptr, "a document has a root");
    if (parser.getDocument() == nullptr) return outcome;
    outcome.counts = checkTree(*parser.getDocument());
    String dump;
    parser.getDocument()->dump(dump);
    outcome.dump = fuzz::unitsOf(dump);
    return outcome;
}

/// Documents whose characters every code page has are the same in all of them.
void checkConverted(const std::string& text, const Outcome& outcome) {
    const PlainLocale locale;
    const Outcome converted = parse(text);
    const bool isPlain = fuzz::isAscii(text) && text.find("&#") == std::string::npos;
    if (!isPlain || text.find("encoding") != std::string::npos) return;
    require(converted.parsed == outcome.parsed, "the code page does not matter");
    require(converted.dump == outcome.dump, "and the tree is the same");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string text = fuzz::upToZero(fuzz::Input(data, size).rest());
    const Outcome outcome = parse(text);
    Counts alone;
    const XML_Error error = parseAlone(text, alone);
    if (error != XML_ERROR_UNKNOWN_ENCODING) {
        require(outcome.parsed == (error == XML_ERROR_NONE),
                "what the event parser accepts is accepted");
    }
    if (outcome.parsed && error == XML_ERROR_NONE) {
        require(outcome.counts.elements == alone.elements, "every element is in the tree");
        require(outcome.counts.attributes == alone.attributes, "every attribute is in the tree");
    }
    checkConverted(text, outcome);
    return 0;
}
