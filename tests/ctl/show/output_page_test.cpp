#include "ctl/show/output_page.h"

#include <gtest/gtest.h>

namespace {

using ctl::Format;

TEST(OutputPage, GoesWhereTheCommandWroteIt) {
    EXPECT_EQ(ctl::outputPage("stdout", "a\n", Format::Text).out, "a\n");
    EXPECT_EQ(ctl::outputPage("stdout", "a\n", Format::Text).err, "");
    EXPECT_EQ(ctl::outputPage("stderr", "a\n", Format::Text).err, "a\n");
}

TEST(OutputPage, LeavesStandardOutputToTheDocument) {
    const ctl::Page page = ctl::outputPage("stdout", "a\n", Format::Json);
    EXPECT_EQ(page.out, "");
    EXPECT_EQ(page.err, "a\n");
}

}  // namespace
