/// A small document model for XML: elements with attributes and text, and the parser that builds
/// it.
///
/// Texts are 0-terminated UTF-16. Use a tree and its parser on one thread at a time, even for
/// searches, because elements cache their results. Documents may be nested as deep as memory
/// allows.
#pragma once

#include <exception>
#include <memory>
#include <string>
#include <vector>

#include "base/read_file.h"
#include "base/zavhmap.h"
#include "base/zavstr.h"
#include "platform/xml1.h"

namespace ZAV {

class DOMNode {
public:
    /// The result of getNodeType.
    enum NodeType : int { ELEMENT_NODE = 1, ATTRIBUTE_NODE = 2 };

    virtual ~DOMNode() {}
    virtual int getNodeType() const = 0;
    /// Appends a readable form to `out`. By default there is none.
    virtual void dump(String& /*out*/) {}
};

/// An ordered list of nodes. An owning list deletes its nodes when it is destroyed.
class DOMNodeList {
public:
    explicit DOMNodeList(bool owning) : owning_(owning) {}
    virtual ~DOMNodeList();
    DOMNodeList(const DOMNodeList&) = delete;
    DOMNodeList& operator=(const DOMNodeList&) = delete;

    /// Appends a node; an owning list takes ownership. Ignores a null pointer.
    void append(DOMNode* node);
    unsigned getLength() const { return static_cast<unsigned>(nodes_.size()); }
    /// The node at `index`; null when there is none. Ownership does not change.
    DOMNode* item(unsigned index) const { return index < nodes_.size() ? nodes_[index] : nullptr; }

    const std::vector<DOMNode*>& nodes() const { return nodes_; }
    /// Removes the last node and returns it; the caller gets the list's ownership. Null when the
    /// list is empty.
    DOMNode* takeLast();

private:
    static constexpr std::size_t kFirstRoom = 4;
    std::vector<DOMNode*> nodes_;
    bool owning_;
};

/// Deletes the DOMNodeList at `p`; does nothing for null. For maps whose values are lists.
void freeDOMNodeListFunc(void* p);

/// Owns a text from String::createUnicodeString or String::copyUnicodeString, or null.
struct UnicodeStringDeleter {
    void operator()(unsigned short* text) const { String::releaseUnicodeString(text); }
};
using UnicodeText = std::unique_ptr<unsigned short[], UnicodeStringDeleter>;

/// The tag name of an element, or null. Most are short enough to lie within the element, which
/// saves a block for each.
class DOMTagName {
public:
    /// Converts from the local code page.
    explicit DOMTagName(const char* name);
    explicit DOMTagName(const unsigned short* name);
    DOMTagName(const DOMTagName&) = delete;
    DOMTagName& operator=(const DOMTagName&) = delete;

    const unsigned short* get() const { return name_; }

private:
    unsigned short* makeRoom(std::size_t units);

    static constexpr std::size_t kShort = 12;
    unsigned short short_[kShort];
    std::unique_ptr<unsigned short[]> long_;
    const unsigned short* name_ = nullptr;  // one of the two above, or null
};

class DOMAttr : public DOMNode {
public:
    /// Converts both from the local code page. A null pointer stays null.
    DOMAttr(const char* name, const char* value);
    DOMAttr(const DOMAttr& other);
    DOMAttr& operator=(const DOMAttr&) = delete;

    int getNodeType() const override { return ATTRIBUTE_NODE; }
    /// Appends name="value".
    void dump(String& out) override;

    /// The attribute's texts; valid as long as the attribute.
    const unsigned short* getName() const { return name_.get(); }
    const unsigned short* getValue() const { return value_.get(); }

private:
    UnicodeText name_;
    UnicodeText value_;
};

/// An element. It owns its attributes and children; all pointers that it returns are valid as long
/// as the element.
class DOMElement : public DOMNode {
public:
    explicit DOMElement(const char* tagName);
    /// Copies only the tag name and the text: the copy has no attributes, children or parent.
    DOMElement(const DOMElement& other);
    DOMElement& operator=(const DOMElement&) = delete;
    ~DOMElement() override;

    int getNodeType() const override { return ELEMENT_NODE; }
    /// Appends the element, its attributes and everything below it, but no text.
    void dump(String& out) override;
    /// The same, with `indent` before each line of the element, and one more tab for each level
    /// below it.
    virtual void dump(const String& indent, String& out);

    const unsigned short* getTagName() const { return tagName_.get(); }
    /// Null until a text is set.
    const unsigned short* getElementText() const { return text_.get(); }
    /// Null for a root.
    DOMElement* getParent() const { return parent_; }
    DOMNodeList* getAttributes() const { return &attributes_; }
    DOMNodeList* getChildren() const { return &children_; }

    /// Adds an attribute after the existing ones, even when one of them has the same name. Does
    /// nothing when either argument is null.
    void setAttribute(const char* name, const char* value);
    /// The value of the first attribute with this name; null when there is none or `name` is null.
    const unsigned short* getAttribute(const char* name) const;
    const unsigned short* getAttribute(const unsigned short* name) const;

    /// Replaces the text by a copy; null removes it.
    void setElementText(const unsigned short* text);
    void setElementText(const char* text);

    /// Takes ownership of a child and becomes its parent. Ignores null.
    void addChild(DOMElement* child);

    /// The direct children with this tag name, in order; null when `name` is null. The first search
    /// for a name creates the list; children added later do not appear in it.
    DOMNodeList* getElementsByTagName(const char* name) const;
    DOMNodeList* getElementsByTagName(const unsigned short* name) const;

private:
    void ownTagLists();

    DOMTagName tagName_;
    mutable DOMNodeList attributes_{true};
    mutable DOMNodeList children_{true};
    DOMElement* parent_ = nullptr;
    mutable StrPtrMap tagLists_;  // non-owning lists by tag name
    UnicodeText text_;
};

/// Builds the tree of one document. Use it once: construct, parse, read the tree, destroy.
class DOMParser {
public:
    /// Copies the text, which must be 0-terminated and in the encoding that it declares.
    explicit DOMParser(const char* xmlText);
    virtual ~DOMParser();
    DOMParser(const DOMParser&) = delete;
    DOMParser& operator=(const DOMParser&) = delete;

    /// Builds the document. Returns 1, or 0 on failure; getErrorMessage then tells why, if known.
    ///
    /// An element's text is everything since the previous end tag, including white space: text
    /// before a first child belongs to that child, text after the last child to the parent.
    int parse();

    /// The root element, or null; valid as long as the parser. After a failure it holds what had
    /// been built by then.
    DOMElement* getDocument() const { return root_.get(); }
    /// Null when there was no error or its reason is not known. Valid as long as the parser.
    const char* getErrorMessage() const { return errorMessage_.get(); }

    /// The handlers for the event parser; `userData` is the DOMParser.
    static void startXMLElement(void* userData, const char* name, const char** atts);
    static void endXMLElement(void* userData, const char* name);
    static void charDataHandler(void* userData, const char* text, int len);

private:
    struct ParserDeleter {
        void operator()(XML1_PARSER* parser) const { XML1_ParserFree(parser); }
    };

    template <typename Action>
    void handleEvent(Action action);
    void startElement(const char* name, const char** atts);
    void endElement();
    void setErrorMessage();

    unsigned length_ = 0;
    void* buffer_ = nullptr;  // the event parser's
    std::unique_ptr<XML1_PARSER, ParserDeleter> parser_;
    std::unique_ptr<DOMElement> root_;
    DOMElement* current_ = nullptr;  // the innermost open element
    std::string characterData_;      // everything since the previous end tag
    MallocedText errorMessage_;
    std::exception_ptr failure_;  // thrown in a handler; must not pass through the event parser
};

}  // namespace ZAV
