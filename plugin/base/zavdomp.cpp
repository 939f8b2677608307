#include "base/zavdomp.h"

#include <algorithm>
#include <cstring>
#include <typeinfo>

namespace ZAV {
namespace {

/// Collects the text of a dump, because a String reallocates too often.
class Dump {
public:
    void add(const unsigned short* text) {
        if (text == nullptr) return;
        while (*text != 0)
            units_.push_back(*text++);
    }
    void add(const char* ascii) {
        while (*ascii != '\0')
            units_.push_back(static_cast<unsigned char>(*ascii++));
    }
    void addTabs(std::size_t count) { units_.insert(units_.end(), count, '\t'); }
    void add(const DOMAttr& attribute) {
        add(attribute.getName());
        add("=\"");
        add(attribute.getValue());
        add("\"");
    }
    void appendTo(String& out) const {
        String text;
        text.assign(units_.data(), static_cast<unsigned>(units_.size()));
        out.append(text);
    }

private:
    std::vector<unsigned short> units_;
};

bool sameText(const unsigned short* a, const unsigned short* b) {
    return a != nullptr && b != nullptr && String::compare(a, b) == 0;
}

bool isElement(const DOMNode& node) {
    return node.getNodeType() == DOMNode::ELEMENT_NODE;
}

const DOMElement& asElement(const DOMNode* node) {
    return static_cast<const DOMElement&>(*node);
}

/// A class derived from ours may dump itself in its own way.
template <typename Class>
bool isExactly(const DOMNode& node) {
    return typeid(node) == typeid(Class);
}

void addAttribute(Dump& dump, DOMNode& node) {
    if (isExactly<DOMAttr>(node)) {
        dump.add(static_cast<const DOMAttr&>(node));
        return;
    }
    String text;
    node.dump(text);
    dump.add(text.getData());
}

void addStartTag(Dump& dump, const DOMElement& element) {
    dump.add("<");
    dump.add(element.getTagName());
    dump.add(" ");
    for (DOMNode* node : element.getAttributes()->nodes()) {
        addAttribute(dump, *node);
        dump.add(" ");
    }
    dump.add(">\n");
}

void addEndTag(Dump& dump, const DOMElement& element) {
    dump.add("</");
    dump.add(element.getTagName());
    dump.add(">");
}

/// Adds a child of a derived class, or one that is not an element.
void addOtherChild(Dump& dump, String indent, std::size_t level, DOMNode& child) {
    for (std::size_t tabs = 0; tabs < level; ++tabs)
        indent.append('\t');
    String text;
    if (isElement(child)) {
        static_cast<DOMElement&>(child).dump(indent, text);
    } else {
        child.dump(text);
    }
    dump.add(text.getData());
    dump.add("\n");
}

/// Writes the tree below `root`. Does not recurse, because documents may be deep.
void addTree(Dump& dump, const String& indent, const DOMElement& root) {
    struct Open {
        const DOMElement* element;
        std::size_t nextChild;
    };
    std::vector<Open> open;
    const auto start = [&](const DOMElement& element) {
        dump.add(indent.getData());
        dump.addTabs(open.size());
        addStartTag(dump, element);
        open.push_back({&element, 0});
    };
    start(root);
    while (!open.empty()) {
        Open& innermost = open.back();
        const std::vector<DOMNode*>& children = innermost.element->getChildren()->nodes();
        if (innermost.nextChild < children.size()) {
            DOMNode& child = *children[innermost.nextChild++];
            if (isExactly<DOMElement>(child)) {
                start(asElement(&child));
            } else {
                addOtherChild(dump, indent, open.size(), child);
            }
            continue;
        }
        const DOMElement& done = *innermost.element;
        open.pop_back();
        dump.add(indent.getData());
        dump.addTabs(open.size());
        addEndTag(dump, done);
        if (!open.empty()) dump.add("\n");
    }
}

}  // namespace

DOMNodeList::~DOMNodeList() {
    if (!owning_) return;
    for (DOMNode* node : nodes_)
        delete node;
}

void DOMNodeList::append(DOMNode* node) {
    if (node == nullptr) return;
    // Few lists stay at one node; growing to two and then to four would cost two blocks more.
    if (nodes_.empty()) nodes_.reserve(kFirstRoom);
    nodes_.push_back(node);
}

DOMNode* DOMNodeList::takeLast() {
    if (nodes_.empty()) return nullptr;
    DOMNode* const last = nodes_.back();
    nodes_.pop_back();
    return last;
}

void freeDOMNodeListFunc(void* p) {
    delete static_cast<DOMNodeList*>(p);
}

DOMTagName::DOMTagName(const char* name) {
    if (name == nullptr) return;
    const std::size_t units = std::strlen(name) + 1;
    unsigned short* const room = makeRoom(units);
    String::convertToUnicode(name, room);
    name_ = room;
}

DOMTagName::DOMTagName(const unsigned short* name) {
    if (name == nullptr) return;
    std::size_t units = 1;
    while (name[units - 1] != 0)
        ++units;
    unsigned short* const room = makeRoom(units);
    std::copy_n(name, units, room);
    name_ = room;
}

unsigned short* DOMTagName::makeRoom(std::size_t units) {
    if (units <= kShort) return short_;
    long_.reset(new unsigned short[units]);
    return long_.get();
}

DOMAttr::DOMAttr(const char* name, const char* value)
    : name_(String::createUnicodeString(name)), value_(String::createUnicodeString(value)) {}

DOMAttr::DOMAttr(const DOMAttr& other)
    : DOMNode(other),
      name_(other.name_ ? String::copyUnicodeString(other.name_.get()) : nullptr),
      value_(other.value_ ? String::copyUnicodeString(other.value_.get()) : nullptr) {}

void DOMAttr::dump(String& out) {
    Dump dump;
    dump.add(*this);
    dump.appendTo(out);
}

DOMElement::DOMElement(const char* tagName) : tagName_(tagName) {
    ownTagLists();
}

DOMElement::DOMElement(const DOMElement& other) : DOMNode(other), tagName_(other.tagName_.get()) {
    ownTagLists();
    setElementText(other.text_.get());
}

void DOMElement::ownTagLists() {
    tagLists_.setAutoDeleteValues(true);
    tagLists_.setFreeValueFunc(reinterpret_cast<void*>(freeDOMNodeListFunc));
}

DOMElement::~DOMElement() {
    // Removes every element below from its parent before deleting it, from the leaves up, so that
    // destructors do not recurse.
    DOMElement* at = this;
    for (;;) {
        if (DOMNode* const child = at->children_.takeLast(); child != nullptr) {
            if (!isElement(*child)) {
                delete child;
                continue;
            }
            auto* const element = static_cast<DOMElement*>(child);
            element->parent_ = at;
            at = element;
            continue;
        }
        if (at == this) return;
        const std::unique_ptr<DOMElement> leaf(at);
        at = leaf->parent_;
    }
}

void DOMElement::dump(String& out) {
    dump(String(), out);
}

void DOMElement::dump(const String& indent, String& out) {
    Dump dump;
    addTree(dump, indent, *this);
    dump.appendTo(out);
}

void DOMElement::setAttribute(const char* name, const char* value) {
    if (name == nullptr || value == nullptr) return;
    auto attribute = std::make_unique<DOMAttr>(name, value);
    attributes_.append(attribute.get());
    attribute.release();
}

const unsigned short* DOMElement::getAttribute(const char* name) const {
    return getAttribute(UnicodeText(String::createUnicodeString(name)).get());
}

const unsigned short* DOMElement::getAttribute(const unsigned short* name) const {
    if (name == nullptr) return nullptr;
    for (const DOMNode* node : attributes_.nodes()) {
        const auto& attribute = static_cast<const DOMAttr&>(*node);
        if (sameText(attribute.getName(), name)) return attribute.getValue();
    }
    return nullptr;
}

void DOMElement::setElementText(const unsigned short* text) {
    text_.reset(text != nullptr ? String::copyUnicodeString(text) : nullptr);
}

void DOMElement::setElementText(const char* text) {
    text_.reset(String::createUnicodeString(text));
}

void DOMElement::addChild(DOMElement* child) {
    if (child == nullptr) return;
    children_.append(child);
    child->parent_ = this;
}

DOMNodeList* DOMElement::getElementsByTagName(const char* name) const {
    return getElementsByTagName(UnicodeText(String::createUnicodeString(name)).get());
}

DOMNodeList* DOMElement::getElementsByTagName(const unsigned short* name) const {
    if (name == nullptr) return nullptr;
    const String key(name);
    void* known = nullptr;
    if (tagLists_.get(key, &known)) return static_cast<DOMNodeList*>(known);
    auto found = std::make_unique<DOMNodeList>(false);
    for (DOMNode* node : children_.nodes()) {
        if (isElement(*node) && sameText(asElement(node).getTagName(), name)) found->append(node);
    }
    tagLists_.put(key, found.get());
    return found.release();
}

}  // namespace ZAV
