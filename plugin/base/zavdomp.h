/// A small document model for XML: elements with their attributes and text, and the parser that
/// builds it.
///
/// Texts are 0-terminated UTF-16. A tree and its parser belong to one thread at a time, searches
/// included, since an element remembers them. Documents may be nested as deep as memory allows.
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
    /// What getNodeType returns.
    enum NodeType : int { ELEMENT_NODE = 1, ATTRIBUTE_NODE = 2 };

    virtual ~DOMNode() {}
    virtual int getNodeType() const = 0;
    /// Appends a readable form to `out`; nothing unless a class says otherwise.
    virtual void dump(String& /*out*/) {}
};

/// Nodes in order. An owning list deletes its nodes with itself.
class DOMNodeList {
public:
    explicit DOMNodeList(bool owning) : owning_(owning) {}
    virtual ~DOMNodeList();
    DOMNodeList(const DOMNodeList&) = delete;
    DOMNodeList& operator=(const DOMNodeList&) = delete;

    /// Puts a node at the end, as its owner if the list owns; a null pointer is ignored.
    void append(DOMNode* node);
    unsigned getLength() const { return static_cast<unsigned>(nodes_.size()); }
    /// The node at `index`, which stays the list's or its owner's; null when there is none.
    DOMNode* item(unsigned index) const { return index < nodes_.size() ? nodes_[index] : nullptr; }

    const std::vector<DOMNode*>& nodes() const { return nodes_; }
    /// Takes the last node out of the list and hands it, and its ownership, to the caller; null
    /// when the list is empty.
    DOMNode* takeLast();

private:
    static constexpr std::size_t kFirstRoom = 4;
    std::vector<DOMNode*> nodes_;
    bool owning_;
};

/// Deletes the DOMNodeList at `p`; null is ignored. For maps whose values are lists.
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
    /// Converts both from the local code page; a null pointer is kept as one.
    DOMAttr(const char* name, const char* value);
    DOMAttr(const DOMAttr& other);
    DOMAttr& operator=(const DOMAttr&) = delete;

    int getNodeType() const override { return ATTRIBUTE_NODE; }
    /// Appends name="value".
    void dump(String& out) override;

    /// The attribute's own texts; valid as long as it is.
    const unsigned short* getName() const { return name_.get(); }
    const unsigned short* getValue() const { return value_.get(); }

private:
    UnicodeText name_;
    UnicodeText value_;
};

/// An element owns its attributes and children. All pointers handed out stay the element's and are
/// valid as long as it is.
class DOMElement : public DOMNode {
public:
    explicit DOMElement(const char* tagName);
    /// Copies the tag name and the text only: the copy has no attributes, children or parent.
    DOMElement(const DOMElement& other);
    DOMElement& operator=(const DOMElement&) = delete;
    ~DOMElement() override;

    int getNodeType() const override { return ELEMENT_NODE; }
    /// Appends the element, its attributes and all below it, without text.
    void dump(String& out) override;
    /// The same with `indent` before each line of the element itself and a tab more for each level
    /// below it.
    virtual void dump(const String& indent, String& out);

    const unsigned short* getTagName() const { return tagName_.get(); }
    /// Null until a text is set.
    const unsigned short* getElementText() const { return text_.get(); }
    /// Null for a root.
    DOMElement* getParent() const { return parent_; }
    DOMNodeList* getAttributes() const { return &attributes_; }
    DOMNodeList* getChildren() const { return &children_; }

    /// Adds an attribute behind those there are, also when one has the same name; ignored when
    /// either is null.
    void setAttribute(const char* name, const char* value);
    /// The value of the first attribute of that name; null when there is none or `name` is null.
    const unsigned short* getAttribute(const char* name) const;
    const unsigned short* getAttribute(const unsigned short* name) const;

    /// Replaces the text by a copy; null takes it away.
    void setElementText(const unsigned short* text);
    void setElementText(const char* text);

    /// Takes a child over and becomes its parent; null is ignored.
    void addChild(DOMElement* child);

    /// The direct children of that tag name, in order; null when `name` is null. The list is made
    /// by the first search for a name and stays as it is, whatever is added afterwards.
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

/// Builds the tree of one document. Used once: construct, parse, read the tree, destroy.
class DOMParser {
public:
    /// Copies the text, which is 0-terminated and in the encoding that it declares.
    explicit DOMParser(const char* xmlText);
    virtual ~DOMParser();
    DOMParser(const DOMParser&) = delete;
    DOMParser& operator=(const DOMParser&) = delete;

    /// 1 when a document was built; else 0, and getErrorMessage tells why, as far as that is known.
    ///
    /// An element's text is everything since the previous end tag, white space included: text
    /// before a first child is that child's, text behind the last child is the parent's.
    int parse();

    /// The root element, or null; it lives as long as the parser. After a failure it is what had
    /// been built until then.
    DOMElement* getDocument() const { return root_.get(); }
    /// Null when there was no error or nothing is known about it; lives as long as the parser.
    const char* getErrorMessage() const { return errorMessage_.get(); }

    /// The event parser's handlers; `userData` is the DOMParser.
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
    std::string characterData_;      // since the previous end tag, as it came
    MallocedText errorMessage_;
    std::exception_ptr failure_;  // what a handler could not let pass through the event parser
};

}  // namespace ZAV
