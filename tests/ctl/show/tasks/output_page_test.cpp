#include "ctl/show/tasks/output_page.h"

#include <gtest/gtest.h>

namespace {

using ctl::Format;
using ctl::OutputPages;

TEST(OutputPages, GoWhereTheCommandWroteThem) {
    OutputPages pages(Format::Text);
    EXPECT_EQ(pages.next("stdout", "a\n").out, "a\n");
    EXPECT_EQ(pages.next("stdout", "a\n").err, "");
    EXPECT_EQ(pages.next("stderr", "a\n").err, "a\n");
}

TEST(OutputPages, LeaveStandardOutputToTheDocument) {
    const ctl::Page page = OutputPages(Format::Json).next("stdout", "a\n");
    EXPECT_EQ(page.out, "");
    EXPECT_EQ(page.err, "a\n");
}

TEST(OutputPages, HidePasswordsWhereverAPieceEnds) {
    OutputPages pages(Format::Text);
    std::string shown = pages.next("stdout", "PASSW").out;
    EXPECT_EQ(pages.next("stderr", "token=abc\n").err, "token=***\n");
    for (const char* piece : {"ORD=sec", "ret\n", "end\n"})
        shown += pages.next("stdout", piece).out;
    EXPECT_EQ(shown, "PASSWORD=***\nend\n");
}

}  // namespace
