#include "ctl/show/fold.h"

#include <gtest/gtest.h>

namespace {

using ctl::folded;
using ctl::foldedText;
using Lines = std::vector<std::string>;

TEST(Fold, BreaksAtBlanksAndLeavesThemOut) {
    EXPECT_EQ(folded("aa bb cc", 5), (Lines{"aa bb", "cc"}));
    EXPECT_EQ(folded("aa bb  cc", 6), (Lines{"aa bb", "cc"}));
    EXPECT_EQ(folded("aa bb", 5), (Lines{"aa bb"}));
    EXPECT_EQ(folded("", 5), (Lines{""}));
    EXPECT_EQ(folded("aaaa    ", 5), (Lines{"aaaa"}));
}

TEST(Fold, BreaksAWordThatIsTooLong) {
    EXPECT_EQ(folded("abcdefgh", 3), (Lines{"abc", "def", "gh"}));
    EXPECT_EQ(folded("x abcdefgh", 3), (Lines{"x", "abc", "def", "gh"}));
}

TEST(Fold, CountsCharactersAndNoColours) {
    const std::string word = "gr\xc3\xbc\xc3\x9f";
    EXPECT_EQ(ctl::widthOf(word), 4U);
    EXPECT_EQ(folded(word + " " + word, 4), (Lines{word, word}));
    const std::string red = "\x1b[31mred\x1b[0m";
    EXPECT_EQ(ctl::widthOf(red), 3U);
    EXPECT_EQ(folded(red + " x", 5), (Lines{red + " x"}));
}

TEST(Fold, OfATextKeepsItsLinesAndIndentsWhatGoesOn) {
    EXPECT_EQ(foldedText("aa bb cc\n  dd ee ff\n\n", 7), "aa bb\n  cc\n  dd\n   ee\n   ff\n\n");
    EXPECT_EQ(foldedText("aa\nbb", 7), "aa\nbb");
}

TEST(Fold, OfATextFitsWhateverItHolds) {
    const std::string text = std::string(300, ' ') + std::string(500, 'x') + " y\n" +
                             std::string(81, 'z') + "\n" + std::string(200, ' ');
    const std::string shown = foldedText(text, 80);
    for (std::size_t start = 0; start < shown.size();) {
        const std::size_t end = std::min(shown.find('\n', start), shown.size());
        EXPECT_LE(end - start, 80U);
        start = end + 1;
    }
}

}  // namespace
