// ctest-label: threaded
// The document model: attributes, elements, lists and their dump.
#include "base/zavdomp.h"

#include <gmock/gmock.h>
#include <pthread.h>

#include <memory>
#include <string>

using namespace ZAV;
using ::testing::ElementsAre;

namespace {

std::string narrow(const unsigned short* text) {
    return text == nullptr ? "(null)" : static_cast<const char*>(String(text).c_str());
}

std::string dumped(DOMNode& node) {
    String out("before:");
    node.dump(out);
    return static_cast<const char*>(out.c_str());
}

/// Counts how many of it live.
class CountedElement : public DOMElement {
public:
    CountedElement() : DOMElement("counted") { ++living; }
    ~CountedElement() override { --living; }
    static int living;
};
int CountedElement::living = 0;

/// A node that leaves everything to its base.
class PlainNode : public DOMNode {
public:
    int getNodeType() const override { return 2; }
};

TEST(DOMNode, DumpsNothingUnlessAClassSaysOtherwise) {
    PlainNode node;
    EXPECT_EQ(dumped(node), "before:");
}

TEST(DOMNode, TypesAreElementAndAttribute) {
    const DOMElement element("a");
    const DOMAttr attribute("k", "v");
    EXPECT_EQ(static_cast<const DOMNode&>(element).getNodeType(), 1);
    EXPECT_EQ(static_cast<const DOMNode&>(attribute).getNodeType(), 2);
}

TEST(DOMNodeList, HoldsNodesInOrder) {
    DOMElement a("a");
    DOMElement b("b");
    DOMNodeList list(false);
    EXPECT_EQ(list.getLength(), 0u);
    EXPECT_EQ(list.item(0), nullptr);
    list.append(&a);
    list.append(nullptr);
    list.append(&b);
    list.append(&a);
    EXPECT_EQ(list.getLength(), 3u);
    EXPECT_EQ(list.item(0), &a);
    EXPECT_EQ(list.item(1), &b);
    EXPECT_EQ(list.item(2), &a);
    EXPECT_EQ(list.item(3), nullptr);
    EXPECT_EQ(list.item(0xFFFFFFFFu), nullptr);
}

TEST(DOMNodeList, OwningListDeletesItsNodes) {
    {
        DOMNodeList owning(true);
        DOMNodeList other(false);
        owning.append(new CountedElement);
        owning.append(new CountedElement);
        other.append(owning.item(0));
        EXPECT_EQ(CountedElement::living, 2);
    }
    EXPECT_EQ(CountedElement::living, 0);
}

TEST(DOMNodeList, FreeFunctionDeletesAList) {
    auto* list = new DOMNodeList(true);
    list->append(new CountedElement);
    freeDOMNodeListFunc(list);
    EXPECT_EQ(CountedElement::living, 0);
    freeDOMNodeListFunc(nullptr);
}

TEST(DOMAttr, HasNameAndValue) {
    DOMAttr attribute("k", "a \"v\"");
    EXPECT_EQ(narrow(attribute.getName()), "k");
    EXPECT_EQ(narrow(attribute.getValue()), "a \"v\"");
    EXPECT_EQ(dumped(attribute), "before:k=\"a \"v\"\"");
}

TEST(DOMAttr, CopyHasItsOwnTexts) {
    auto original = std::make_unique<DOMAttr>("k", "v");
    const DOMAttr copy(*original);
    EXPECT_NE(copy.getName(), original->getName());
    original.reset();
    EXPECT_EQ(narrow(copy.getName()), "k");
    EXPECT_EQ(narrow(copy.getValue()), "v");
}

TEST(DOMAttr, NullTextsStayNull) {
    const DOMAttr original(nullptr, nullptr);
    const DOMAttr copy(original);
    EXPECT_EQ(copy.getName(), nullptr);
    EXPECT_EQ(copy.getValue(), nullptr);
}

TEST(DOMElement, IsCreatedEmpty) {
    const DOMElement element("tag");
    EXPECT_EQ(narrow(element.getTagName()), "tag");
    EXPECT_EQ(element.getElementText(), nullptr);
    EXPECT_EQ(element.getParent(), nullptr);
    EXPECT_EQ(element.getAttributes()->getLength(), 0u);
    EXPECT_EQ(element.getChildren()->getLength(), 0u);
}

TEST(DOMElement, TagNamesOfEveryLengthAreKeptAndCopied) {
    for (std::size_t length = 0; length <= 40; ++length) {
        const std::string name(length, 'n');
        const DOMElement element(name.c_str());
        const DOMElement copy(element);
        EXPECT_EQ(narrow(element.getTagName()), name);
        EXPECT_EQ(narrow(copy.getTagName()), name);
        EXPECT_NE(copy.getTagName(), element.getTagName());
    }
    const DOMElement nameless(nullptr);
    EXPECT_EQ(nameless.getTagName(), nullptr);
    EXPECT_EQ(DOMElement(nameless).getTagName(), nullptr);
}

TEST(DOMElement, CopyHasOnlyNameAndText) {
    DOMElement parent("parent");
    auto* original = new DOMElement("tag");
    parent.addChild(original);
    original->setElementText("text");
    original->setAttribute("k", "v");
    original->addChild(new DOMElement("child"));
    ASSERT_EQ(original->getElementsByTagName("child")->getLength(), 1u);

    const DOMElement copy(*original);
    EXPECT_EQ(narrow(copy.getTagName()), "tag");
    EXPECT_EQ(narrow(copy.getElementText()), "text");
    EXPECT_NE(copy.getElementText(), original->getElementText());
    EXPECT_EQ(copy.getParent(), nullptr);
    EXPECT_EQ(copy.getAttributes()->getLength(), 0u);
    EXPECT_EQ(copy.getChildren()->getLength(), 0u);
    EXPECT_EQ(copy.getElementsByTagName("child")->getLength(), 0u);
}

TEST(DOMElement, CopyOfAnElementWithoutTextHasNone) {
    const DOMElement original("tag");
    const DOMElement copy(original);
    EXPECT_EQ(copy.getElementText(), nullptr);
}

TEST(DOMElement, KeepsAttributesOfOneNameAndFindsTheFirst) {
    DOMElement element("a");
    element.setAttribute("x", "1");
    element.setAttribute("x", "2");
    element.setAttribute("y", "3");
    element.setAttribute(nullptr, "4");
    element.setAttribute("z", nullptr);
    EXPECT_EQ(element.getAttributes()->getLength(), 3u);
    EXPECT_EQ(narrow(element.getAttribute("x")), "1");
    EXPECT_EQ(narrow(element.getAttribute("y")), "3");
    EXPECT_EQ(narrow(element.getAttribute(String("y").getData())), "3");
    EXPECT_EQ(element.getAttribute("X"), nullptr);
    EXPECT_EQ(element.getAttribute("z"), nullptr);
    EXPECT_EQ(element.getAttribute(static_cast<const char*>(nullptr)), nullptr);
    EXPECT_EQ(element.getAttribute(static_cast<const unsigned short*>(nullptr)), nullptr);
}

TEST(DOMElement, TextIsReplacedByACopy) {
    DOMElement element("a");
    const String first("first");
    element.setElementText(first.getData());
    EXPECT_EQ(narrow(element.getElementText()), "first");
    EXPECT_NE(element.getElementText(), first.getData());
    element.setElementText("second");
    EXPECT_EQ(narrow(element.getElementText()), "second");
    element.setElementText(element.getElementText());
    EXPECT_EQ(narrow(element.getElementText()), "second");
    element.setElementText(static_cast<const char*>(nullptr));
    EXPECT_EQ(element.getElementText(), nullptr);
}

TEST(DOMElement, TakesChildrenOver) {
    {
        CountedElement parent;
        auto* child = new CountedElement;
        parent.addChild(child);
        parent.addChild(nullptr);
        child->addChild(new CountedElement);
        EXPECT_EQ(parent.getChildren()->getLength(), 1u);
        EXPECT_EQ(child->getParent(), &parent);
        EXPECT_EQ(CountedElement::living, 3);
    }
    EXPECT_EQ(CountedElement::living, 0);
}

TEST(DOMElement, FindsDirectChildrenByTagName) {
    DOMElement root("a");
    auto* first = new DOMElement("b");
    auto* second = new DOMElement("b");
    root.addChild(first);
    root.addChild(new DOMElement("c"));
    root.addChild(second);
    root.addChild(new DOMElement("B"));
    first->addChild(new DOMElement("b"));

    DOMNodeList* const found = root.getElementsByTagName("b");
    ASSERT_EQ(found->getLength(), 2u);
    EXPECT_EQ(found->item(0), first);
    EXPECT_EQ(found->item(1), second);
    EXPECT_EQ(root.getElementsByTagName("b"), found);
    EXPECT_EQ(root.getElementsByTagName(String("b").getData()), found);
    EXPECT_EQ(root.getElementsByTagName("none")->getLength(), 0u);
    EXPECT_EQ(root.getElementsByTagName(static_cast<const char*>(nullptr)), nullptr);
    EXPECT_EQ(root.getElementsByTagName(static_cast<const unsigned short*>(nullptr)), nullptr);
}

TEST(DOMElement, SearchKeepsItsFirstAnswer) {
    DOMElement root("a");
    DOMNodeList* const before = root.getElementsByTagName("b");
    root.addChild(new DOMElement("b"));
    EXPECT_EQ(root.getElementsByTagName("b"), before);
    EXPECT_EQ(before->getLength(), 0u);
}

TEST(DOMElement, DumpShowsStructureAndAttributes) {
    DOMElement root("a");
    root.setAttribute("k", "v");
    root.setElementText("not shown");
    root.addChild(new DOMElement("b"));
    EXPECT_EQ(dumped(root), "before:<a k=\"v\" >\n\t<b >\n\t</b>\n</a>");
}

/// Dump themselves in a way of their own.
class OwnElement : public DOMElement {
public:
    OwnElement() : DOMElement("own") {}
    using DOMElement::dump;
    void dump(const String& indent, String& out) override { out.append(indent).append("(own)"); }
};

class OwnAttribute : public DOMAttr {
public:
    OwnAttribute() : DOMAttr("k", "v") {}
    void dump(String& out) override { out.append("k is v"); }
};

TEST(DOMElement, DumpAsksChildrenAndAttributesOfDerivedClasses) {
    DOMElement root("a");
    auto* b = new DOMElement("b");
    root.addChild(b);
    b->addChild(new OwnElement);
    b->addChild(new DOMElement("c"));
    root.addChild(new CountedElement);
    b->getAttributes()->append(new OwnAttribute);
    String out;
    root.dump("> ", out);
    EXPECT_STREQ(out.c_str(),
                 "> <a >\n"
                 "> \t<b k is v >\n"
                 "> \t\t(own)\n"
                 "> \t\t<c >\n"
                 "> \t\t</c>\n"
                 "> \t</b>\n"
                 "> \t<counted >\n"
                 "> \t</counted>\n"
                 "> </a>");
}

TEST(DOMElement, NodesInItsListThatAreNoElementsArePassedOver) {
    DOMElement root("a");
    root.getChildren()->append(new DOMAttr("b", "v"));
    root.getChildren()->append(new PlainNode);
    auto* b = new DOMElement("b");
    root.addChild(b);
    ASSERT_EQ(root.getElementsByTagName("b")->getLength(), 1u);
    EXPECT_EQ(root.getElementsByTagName("b")->item(0), b);
    EXPECT_EQ(dumped(root), "before:<a >\nb=\"v\"\n\n\t<b >\n\t</b>\n</a>");
}

TEST(DOMElement, DumpIndentsEveryLevelByATab) {
    DOMElement root("a");
    auto* b = new DOMElement("b");
    auto* c = new DOMElement("c");
    root.addChild(b);
    root.addChild(new DOMElement("d"));
    b->addChild(c);
    c->setAttribute("x", "1");
    c->setAttribute("x", "2");
    String out;
    root.dump("> ", out);
    EXPECT_STREQ(out.c_str(),
                 "> <a >\n"
                 "> \t<b >\n"
                 "> \t\t<c x=\"1\" x=\"2\" >\n"
                 "> \t\t</c>\n"
                 "> \t</b>\n"
                 "> \t<d >\n"
                 "> \t</d>\n"
                 "> </a>");
}

/// A chain of `depth` elements.
std::unique_ptr<DOMElement> chain(unsigned depth) {
    auto root = std::make_unique<DOMElement>("a");
    DOMElement* innermost = root.get();
    for (unsigned i = 1; i < depth; ++i) {
        auto* child = new DOMElement("a");
        innermost->addChild(child);
        innermost = child;
    }
    return root;
}

/// Runs `work` on a thread with a stack of 256 KiB.
template <typename Work>
void onSmallStack(Work work) {
    pthread_attr_t attributes;
    ASSERT_EQ(::pthread_attr_init(&attributes), 0);
    ASSERT_EQ(::pthread_attr_setstacksize(&attributes, 256 * 1024), 0);
    pthread_t thread;
    const auto run = [](void* argument) -> void* {
        (*static_cast<Work*>(argument))();
        return nullptr;
    };
    ASSERT_EQ(::pthread_create(&thread, &attributes, run, &work), 0);
    ::pthread_join(thread, nullptr);
    ::pthread_attr_destroy(&attributes);
}

TEST(DOMElement, DeepTreesDoNotExhaustTheStack) {
    onSmallStack([] { chain(100000).reset(); });
}

TEST(DOMElement, DeepDumpsDoNotExhaustTheStack) {
    constexpr unsigned kDepth = 5000;
    String out;
    onSmallStack([&out] { chain(kDepth)->dump(out); });
    // Each element has a start line of 5 units, an end line of 5, and its indent twice.
    EXPECT_EQ(out.length(), kDepth * 10 - 1 + kDepth * (kDepth - 1));
}

}  // namespace
