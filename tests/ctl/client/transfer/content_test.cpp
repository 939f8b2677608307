#include "ctl/client/transfer/content.h"

#include <gtest/gtest.h>

#include "ctl/client/failure.h"
#include "support/scratch_dir.h"

namespace {

using ctl::Content;

Content contentOf(const std::string& bytes) {
    const ScratchDir scratch;
    return ctl::contentOf(scratch.write("file", bytes));
}

TEST(Content, OfAScriptFromAnotherSystemIsTextThatChanges) {
    const Content content = contentOf("#!/bin/sh\r\nexit 0\r\n\x1a");
    EXPECT_TRUE(content.isText);
    EXPECT_TRUE(content.changes);
}

TEST(Content, OfAScriptOfThisSystemDoesNotChange) {
    const Content content = contentOf("#!/bin/sh\n\techo \"\xC3\xA4\xE4\" \x1b[1m\f\n");
    EXPECT_TRUE(content.isText);
    EXPECT_FALSE(content.changes);
}

TEST(Content, OfAnArchiveIsNoText) {
    const Content content = contentOf(std::string("\x1f\x8b\x08\0\r\x1a", 6));
    EXPECT_FALSE(content.isText);
    EXPECT_TRUE(content.changes);
    EXPECT_FALSE(contentOf(std::string("\x1f\x8b\x08\0", 4)).changes);
}

TEST(Content, IsReadToTheEnd) {
    const std::string text(200'000, 'x');
    EXPECT_TRUE(contentOf(text + '\r').changes);
    EXPECT_FALSE(contentOf(text + '\0').isText);
    EXPECT_TRUE(contentOf("").isText);
}

TEST(Content, ThatCannotBeReadIsWrongUsage) {
    const ScratchDir scratch;
    try {
        ctl::contentOf(scratch.path("none"));
        FAIL();
    } catch (const ctl::Failure& failure) {
        EXPECT_EQ(failure.status(), ctl::kWrongUsage);
        EXPECT_EQ(std::string(failure.what()),
                  "cannot read " + scratch.path("none") + ": No such file or directory");
    }
}

TEST(UnconvertedName, HasNoneOfTheMarks) {
    EXPECT_EQ(ctl::unconvertedName("ux/preinstall.sh.tar.gz"), "ux/preinstall_sh.tar.gz");
    EXPECT_EQ(ctl::unconvertedName("a.mdl.mdl"), "a_mdl_mdl");
    EXPECT_EQ(ctl::unconvertedName("DeployLnk.sh"), "DeployLnk_sh");
    EXPECT_EQ(ctl::unconvertedName("other.sh"), "other.sh");
}

}  // namespace
