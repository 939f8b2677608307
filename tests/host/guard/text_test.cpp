// The guard of text outside ASCII in a locale of UTF-8.
#include "host/guard/text_fixture.h"

namespace {

/// One, two, three and four bytes in UTF-8.
const char* const kLetters[] = {"a", "\u00e4", "\u20ac", "\U0001F600"};

TEST_F(TextGuard, EveryColumnThatTakesTextIsWhole) {
    for (const char* letter : kLetters) {
        for (int count = 0; count <= 300; ++count) {
            const std::string text = repeated(letter, count);
            expectWholeContext("N=" + text);
            expectWholeMetafile("m" + text + ".mdl");
            expectWholeScripts({"s" + text});
        }
    }
}

TEST_F(TextGuard, MixedTextIsWhole) {
    std::string text;
    for (int i = 0; i < 300; ++i) {
        text += kLetters[(i * 7 + i / 3) % 4];
        expectWholeContext(text);
        expectWholeMetafile(text);
        expectWholeScripts({text});
        expectWholeScripts({"first.sh", text});
    }
}

TEST_F(TextGuard, WithoutItTextIsCut) {
    const std::string text = repeated("\u00e4", 10);
    EXPECT_EQ(narrowed(text.c_str()), repeated("\u00e4", 5));
}

TEST_F(TextGuard, AppendsBytesLessUnitsLessOne) {
    EXPECT_EQ(mended("CONTEXT", "\u00e4"), "\u00e4");
    EXPECT_EQ(mended("CONTEXT", "\u00e4\u00e4"), "\u00e4\u00e4 ");
    EXPECT_EQ(mended("CONTEXT", "\u20ac"), "\u20ac ");
    EXPECT_EQ(mended("CONTEXT", "\U0001F600"), "\U0001F600 ");
    EXPECT_EQ(mended("CONTEXT", "plain ascii"), "plain ascii");
    EXPECT_EQ(mended("UACONFIG", "\u00e4\u00e4\u00e4"), "\u00e4\u00e4\u00e4\" ")
        << "the quote ends the name in the console's command line";
}

TEST_F(TextGuard, EachScriptGetsItsOwnBlanks) {
    const std::string a = "\u00e4\u00e4";
    EXPECT_EQ(mended("UASCRIPT", "x," + a), "x," + a + " ");
    expectWholeScripts({a, "plain", a + a});
    expectWholeScripts({a, a, a});
}

TEST_F(TextGuard, TheRowThatAnswersIsWantedHoweverMuchOfAListItRepeats) {
    const std::string a = "\u00e4\u00e4";
    for (const std::string& list : {a, "x," + a, a + ",x", a + "," + a}) {
        const host::CommandRequest request =
            admitted(given({{"COMMAND", "GETCONFIG"}, {"UASCRIPT", list}}));
        const oxa::Predicate& condition = request.conditions().back();
        // What the row holds: the plug-in's text, padded with blanks to the column's width.
        std::string row = narrowed(condition.value.c_str());
        std::string value = condition.value;
        row.resize(512, ' ');
        value.resize(512, ' ');
        EXPECT_EQ(condition.op == OPER_NE, row != value) << list;
    }
}

TEST_F(TextGuard, OtherColumnsTakeAsciiOnly) {
    for (const char* column :
         {"COMMAND", "TRANSID", "PRODUCT", "VERSION", "OPTIONAL", "TARGETMSN"}) {
        EXPECT_EQ(
            refusalOf(given({{column, "gr\u00fcn"}})),
            "text 400: the value of column " + std::string(column) +
                " is not in ASCII; only CONTEXT, UACONFIG and UASCRIPT take other characters");
    }
}

}  // namespace
