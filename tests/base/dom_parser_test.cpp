// Building the document model from XML.
#include <gtest/gtest.h>

#include <memory>
#include <string>

#include "base/zavdomp.h"

using namespace ZAV;

namespace {

std::string narrow(const unsigned short* text) {
    return text == nullptr ? "(null)" : static_cast<const char*>(String(text).c_str());
}

const DOMElement& child(const DOMElement& parent, unsigned index) {
    return dynamic_cast<const DOMElement&>(*parent.getChildren()->item(index));
}

TEST(DOMParser, BuildsTheTree) {
    DOMParser parser("<?xml version=\"1.0\"?><!-- x --><a k=\"v\" l='w'><b/><c><d/></c></a>\n");
    ASSERT_EQ(parser.parse(), 1);
    EXPECT_EQ(parser.getErrorMessage(), nullptr);
    const DOMElement& root = *parser.getDocument();
    EXPECT_EQ(narrow(root.getTagName()), "a");
    EXPECT_EQ(narrow(root.getAttribute("k")), "v");
    EXPECT_EQ(narrow(root.getAttribute("l")), "w");
    EXPECT_EQ(root.getParent(), nullptr);
    ASSERT_EQ(root.getChildren()->getLength(), 2u);
    EXPECT_EQ(narrow(child(root, 0).getTagName()), "b");
    EXPECT_EQ(narrow(child(root, 0).getElementText()), "");
    EXPECT_EQ(narrow(child(child(root, 1), 0).getTagName()), "d");
    EXPECT_EQ(child(child(root, 1), 0).getParent(), &child(root, 1));
}

TEST(DOMParser, NothingIsBuiltBeforeTheParse) {
    const DOMParser parser("<a/>");
    EXPECT_EQ(parser.getDocument(), nullptr);
    EXPECT_EQ(parser.getErrorMessage(), nullptr);
}

TEST(DOMParser, TextIsEverythingSinceThePreviousEndTag) {
    DOMParser parser("<a>t<b>u</b>v</a>");
    ASSERT_EQ(parser.parse(), 1);
    EXPECT_EQ(narrow(child(*parser.getDocument(), 0).getElementText()), "tu");
    EXPECT_EQ(narrow(parser.getDocument()->getElementText()), "v");
}

TEST(DOMParser, LeavesCarryTheIndentationBeforeThem) {
    DOMParser parser("<a>\n\t<b>\n\t\t<c>X</c>\n\t</b>\n</a>");
    ASSERT_EQ(parser.parse(), 1);
    const DOMElement& b = child(*parser.getDocument(), 0);
    EXPECT_EQ(narrow(child(b, 0).getElementText()), "\n\t\n\t\tX");
    EXPECT_EQ(narrow(b.getElementText()), "\n\t");
    EXPECT_EQ(narrow(parser.getDocument()->getElementText()), "\n");
}

TEST(DOMParser, TextOfSeveralEventsIsJoined) {
    DOMParser parser("<a>one &amp; two\nthree<![CDATA[<four>]]>&#70;</a>");
    ASSERT_EQ(parser.parse(), 1);
    EXPECT_EQ(narrow(parser.getDocument()->getElementText()), "one & two\nthree<four>F");
}

TEST(DOMParser, MalformedTextGivesPlaceAndReason) {
    DOMParser parser("<a>\n<b></a>");
    EXPECT_EQ(parser.parse(), 0);
    EXPECT_STREQ(parser.getErrorMessage(), "2:5: mismatched tag\n");
}

TEST(DOMParser, UnclosedElementIsIncomplete) {
    for (const char* text : {"<a><b></b>", "<a>", "<a k='v'>text\n", "<a><b>text\r", "<a>]"}) {
        DOMParser parser(text);
        EXPECT_EQ(parser.parse(), 0) << text;
        EXPECT_STREQ(parser.getErrorMessage(), "incomplete xml") << text;
    }
}

TEST(DOMParser, TextThatEndsWithinATagIsMalformed) {
    DOMParser parser("<a><b");
    EXPECT_EQ(parser.parse(), 0);
    EXPECT_STREQ(parser.getErrorMessage(), "1:3: unclosed token\n");
}

TEST(DOMParser, SecondRootIsAnError) {
    DOMParser parser("<a/><b/>");
    EXPECT_EQ(parser.parse(), 0);
    EXPECT_STREQ(parser.getErrorMessage(), "1:4: junk after document element\n");
    EXPECT_EQ(narrow(parser.getDocument()->getTagName()), "a");
}

TEST(DOMParser, TextWithoutAnElementIsAnError) {
    for (const char* text : {"", " ", "<!-- only -->", "words"}) {
        DOMParser parser(text);
        EXPECT_EQ(parser.parse(), 0) << text;
        EXPECT_EQ(parser.getDocument(), nullptr) << text;
        EXPECT_NE(parser.getErrorMessage(), nullptr) << text;
    }
}

TEST(DOMParser, EveryCutOfADocumentIsRefused) {
    const std::string whole = "<?xml version='1.0'?><a k='v'>t<b>&lt;u</b><!-- c --></a>";
    for (std::size_t length = 0; length < whole.size(); ++length) {
        DOMParser parser(whole.substr(0, length).c_str());
        EXPECT_EQ(parser.parse(), 0) << length;
    }
    EXPECT_EQ(DOMParser(whole.c_str()).parse(), 1);
}

TEST(DOMParser, CopiesItsText) {
    auto text =
        std::make_unique<std::string>("<a>content that is long enough to be on the heap</a>");
    DOMParser parser(text->c_str());
    text.reset();
    ASSERT_EQ(parser.parse(), 1);
    EXPECT_EQ(narrow(parser.getDocument()->getElementText()),
              "content that is long enough to be on the heap");
}

TEST(DOMParser, DeepDocumentsDoNotExhaustTheStack) {
    constexpr int kDepth = 100000;
    std::string text;
    for (int i = 0; i < kDepth; ++i)
        text += "<a>";
    for (int i = 0; i < kDepth; ++i)
        text += "</a>";
    DOMParser parser(text.c_str());
    EXPECT_EQ(parser.parse(), 1);
}

}  // namespace
