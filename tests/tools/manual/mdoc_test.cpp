// How texts become lines of a manual page.
#include "tools/manual/mdoc.h"

#include <gtest/gtest.h>

#include <stdexcept>

#include "support/scratch_dir.h"

namespace {

using manual::escaped;
using manual::sentences;

TEST(ManualText, LeavesNothingThatMdocWouldTakeForItsOwn) {
    EXPECT_EQ(escaped("a\\b"), "a\\eb");
    EXPECT_EQ(escaped("--force"), "\\-\\-force");
    EXPECT_EQ(escaped(".Sh no macro"), "\\&.Sh no macro");
    EXPECT_EQ(escaped("'quoted'"), "\\&'quoted'");
    EXPECT_EQ(escaped("in .rpc"), "in .rpc");
}

TEST(ManualText, BecomesSentences) {
    EXPECT_EQ(sentences("the port; 660 if\nnot given"), "The port; 660 if not given.\n");
    EXPECT_EQ(sentences("One. Another."), "One.\nAnother.\n");
    EXPECT_EQ(sentences(""), "");
}

TEST(ManualText, IsBrokenIntoShortLines) {
    const std::string text = sentences(std::string(60, 'a') + " bbbbbbbbbb ccccc");
    EXPECT_EQ(text, "A" + std::string(59, 'a') + "\nbbbbbbbbbb ccccc.\n");
}

class ManualTemplates : public testing::Test {
protected:
    std::string fill(const std::string& text, const manual::Fillings& fillings) const {
        return manual::filled(scratch.write("page.in", text), fillings);
    }

    const ScratchDir scratch;
};

TEST_F(ManualTemplates, HaveTheirPlacesFilled) {
    EXPECT_EQ(fill(".Dt @NAME@ 1\n@LIST@\n.Sh END\n", {{"NAME", "X"}, {"LIST", ".It a\n.It b\n"}}),
              ".Dt X 1\n.It a\n.It b\n.Sh END\n");
}

TEST_F(ManualTemplates, LoseLinesThatAreFilledWithNothing) {
    EXPECT_EQ(fill("a\n@LIST@\n\nb\n", {{"LIST", ""}}), "a\n\nb\n");
}

TEST_F(ManualTemplates, AreRefusedWithPlacesThatNobodyFills) {
    EXPECT_THROW(fill("@OTHER@\n", {{"NAME", "x"}}), std::runtime_error);
    EXPECT_THROW(fill("me@example\n", {}), std::runtime_error);
    EXPECT_THROW(manual::filled(scratch.path("none"), {}), std::runtime_error);
}

}  // namespace
