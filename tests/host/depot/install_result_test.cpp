#include "host/depot/install_result.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "support/scratch_dir.h"

namespace {

using host::InstallResult;
using Content = InstallResult::Content;

class AnInstallsResult : public testing::Test {
protected:
    Content with(const std::string& text) const {
        scratch.write("rc.txt", text);
        return result.look();
    }

    const ScratchDir scratch;
    const InstallResult result{scratch.path()};
};

TEST_F(AnInstallsResult, IsANumberWithBlanksAroundIt) {
    EXPECT_EQ(with("0\n"), Content::Number);
    EXPECT_EQ(with(" 9 "), Content::Number);
    EXPECT_EQ(with("-1\n"), Content::Number);
}

TEST_F(AnInstallsResult, IsNoneWhenItSaysAnythingElse) {
    for (const char* text : {"", "\n", "nine", "0x9", "9 9", "99999999999"})
        EXPECT_EQ(with(text), Content::Other) << text;
}

TEST_F(AnInstallsResult, MayNotHaveComeYet) {
    EXPECT_EQ(result.look(), Content::Missing);
    EXPECT_EQ(InstallResult(scratch.path("none")).look(), Content::Missing);
}

TEST_F(AnInstallsResult, IsNeitherALinkNorAPipe) {
    scratch.write("other", "0\n");
    ASSERT_EQ(::symlink("other", result.path().c_str()), 0);
    EXPECT_EQ(result.look(), Content::Other);
    ASSERT_EQ(::unlink(result.path().c_str()), 0);
    ASSERT_EQ(::mkfifo(result.path().c_str(), 0600), 0);
    EXPECT_EQ(result.look(), Content::Other);
}

TEST_F(AnInstallsResult, IsGoneOnceItWasRemoved) {
    scratch.write("rc.txt", "0\n");
    EXPECT_TRUE(result.remove());
    EXPECT_EQ(result.look(), Content::Missing);
    EXPECT_TRUE(result.remove()) << "there is none";
    ASSERT_EQ(::mkdir(result.path().c_str(), 0700), 0);
    EXPECT_FALSE(result.remove());
}

}  // namespace
