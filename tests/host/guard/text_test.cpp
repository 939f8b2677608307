// The guard of text outside ASCII, checked with the plug-in's own texts: what it makes of the
// values on their way into a child or a file.
#include <algorithm>

#include "base/zavstr.h"
#include "base/zavtoken.h"
#include "host/guard/guard_fixture.h"
#include "support/scoped_env.h"
#include "util/zavprocs.h"

namespace {

using ZAV::String;

/// One, two, three and four bytes in UTF-8.
const char* const kLetters[] = {"a", "\u00e4", "\u20ac", "\U0001F600"};

std::string repeated(const std::string& letter, int count) {
    std::string text;
    for (int i = 0; i < count; ++i)
        text += letter;
    return text;
}

/// What a child or a system call gets of the text.
std::string narrowed(const String& text) {
    return static_cast<const char*>(text.c_str());
}

/// The last argument of a command line.
std::string lastArgument(const String& command) {
    char** argv = nullptr;
    const int count = ZAV::MakeArgv(&command, &argv);
    std::string last = count > 0 ? argv[count - 1] : "";
    for (int i = 0; i < count; ++i)
        ::free(argv[i]);
    ::free(argv);
    return last;
}

class TextGuard : public GuardTest {
protected:
    explicit TextGuard(const char* codePage = "UTF-8", const char* locale = "C.UTF-8")
        : GuardTest(codePage), locale_("LC_ALL", locale) {}

    std::string mended(const std::string& column, const std::string& value) {
        return admitted(given({{"COMMAND", "GETCONFIG"}, {column, value}})).value(column);
    }
    /// Checks what a translator gets on its standard input.
    void expectWholeContext(const std::string& text) {
        EXPECT_EQ(narrowed(mended("CONTEXT", text).c_str()), text);
    }
    void expectWholeMetafile(const std::string& name) {
        const String value(mended("UACONFIG", name).c_str());
        EXPECT_EQ(narrowed("/depot/" + value), "/depot/" + name);
        EXPECT_EQ(lastArgument("/home/bin/um_console -h /home -c \"IMPORT /meta/" + value + "\""),
                  "IMPORT /meta/" + name);
        EXPECT_EQ(narrowed(value), name) << "in the row that answers";
    }
    void expectWholeScripts(const std::vector<std::string>& names) {
        std::string list;
        for (const std::string& name : names)
            list += (list.empty() ? "" : ",") + name;
        const String value(mended("UASCRIPT", list).c_str());
        StringTokenizer tokens(value, ",");
        for (const std::string& name : names)
            EXPECT_EQ(narrowed("/depot/" + tokens.nextToken()), "/depot/" + name);
        EXPECT_FALSE(tokens.hasMoreTokens());
    }

private:
    ScopedEnv locale_;
};

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

/// The plug-in takes the bytes of the plain locale for ISO 8859-1.
class TextGuardOfOneByte : public TextGuard {
protected:
    TextGuardOfOneByte() : TextGuard("ISO-8859-1", "C") {}
};

TEST_F(TextGuardOfOneByte, AppendsNothing) {
    for (int count = 0; count <= 300; ++count) {
        const std::string text = repeated("\xE4", count);
        expectWholeContext(text);
        expectWholeMetafile(text);
        if (count > 0) expectWholeScripts({text, text});
        EXPECT_EQ(mended("CONTEXT", text), text);
        EXPECT_EQ(mended("UACONFIG", text), text);
        EXPECT_EQ(mended("UASCRIPT", text + "," + text), text + "," + text);
    }
}

TEST_F(TextGuardOfOneByte, OtherColumnsTakeAsciiOnly) {
    EXPECT_EQ(refuser(given({{"TRANSID", "gr\xFCn"}})), "text");
}

}  // namespace
