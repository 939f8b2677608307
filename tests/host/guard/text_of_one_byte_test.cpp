// The guard of text outside ASCII where a letter is one byte.
#include "host/guard/text_fixture.h"

namespace {

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
