#include "fleet/files/files.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>

#include "fleet/files/file_error.h"
#include "support/scratch_dir.h"

namespace {

using fleet::FileError;
using fleet::readFile;
using fleet::replaceFile;
using fleet::Secrecy;

class FleetFiles : public testing::Test {
protected:
    mode_t modeOf(const std::string& name) const {
        struct stat found {};
        EXPECT_EQ(::stat(scratch.path(name).c_str(), &found), 0);
        return found.st_mode & 07777U;
    }
    /// What a reading is refused with; "" if it is not.
    std::string refusal(const std::string& name, Secrecy secrecy) const {
        try {
            readFile(scratch.path(name), secrecy);
            return "";
        } catch (const FileError& error) {
            return error.what();
        }
    }

    ScratchDir scratch;
};

TEST_F(FleetFiles, WhatWasReplacedIsRead) {
    replaceFile(scratch.path("a"), "one", Secrecy::Secret);
    replaceFile(scratch.path("a"), std::string("two\0three", 9), Secrecy::Secret);
    EXPECT_EQ(readFile(scratch.path("a"), Secrecy::Secret), std::string("two\0three", 9));
    EXPECT_FALSE(scratch.exists("a.new"));
}

TEST_F(FleetFiles, ModesFollowTheSecrecyWhateverTheMaskIs) {
    const mode_t mask = ::umask(0);
    replaceFile(scratch.path("secret"), "x", Secrecy::Secret);
    ::umask(0777);
    replaceFile(scratch.path("public"), "x", Secrecy::Public);
    ::umask(mask);
    EXPECT_EQ(modeOf("secret"), 0600U);
    EXPECT_EQ(modeOf("public"), 0644U);
}

TEST_F(FleetFiles, WhatAKilledWriterHasLeftIsWrittenOver) {
    scratch.write("a", "old", 0600);
    scratch.write("a.new", "half of a long te", 0400);
    replaceFile(scratch.path("a"), "new", Secrecy::Secret);
    EXPECT_EQ(scratch.read("a"), "new");
    EXPECT_FALSE(scratch.exists("a.new"));
}

TEST_F(FleetFiles, WhatCannotBeWrittenLeavesTheOldOne) {
    scratch.makeDir("a/below");
    EXPECT_THROW(replaceFile(scratch.path("a"), "x", Secrecy::Secret), FileError);
    EXPECT_TRUE(scratch.exists("a/below"));
    EXPECT_FALSE(scratch.exists("a.new"));
    EXPECT_THROW(replaceFile(scratch.path("none/a"), "x", Secrecy::Secret), FileError);
}

TEST_F(FleetFiles, ASecretThatOthersMayReadIsRefused) {
    scratch.write("a", "x", 0640);
    EXPECT_NE(refusal("a", Secrecy::Secret).find("others may read it"), std::string::npos);
    EXPECT_EQ(refusal("a", Secrecy::Public), "");
}

TEST_F(FleetFiles, WhatOthersMayWriteIsRefused) {
    scratch.write("a", "x");
    ::chmod(scratch.path("a").c_str(), 0666);
    EXPECT_NE(refusal("a", Secrecy::Public).find("others may write"), std::string::npos);
}

TEST_F(FleetFiles, OnlyPlainFilesAreRead) {
    scratch.makeDir("directory");
    EXPECT_NE(refusal("directory", Secrecy::Public).find("no plain file"), std::string::npos);
    ASSERT_EQ(::mkfifo(scratch.path("pipe").c_str(), 0600), 0);
    EXPECT_NE(refusal("pipe", Secrecy::Public).find("no plain file"), std::string::npos);
    EXPECT_NE(refusal("nothing", Secrecy::Public).find("No such file"), std::string::npos);
}

TEST_F(FleetFiles, WhatIsTooLongIsRefused) {
    scratch.write("most", std::string(1 << 20, 'x'));
    scratch.write("more", std::string((1 << 20) + 1, 'x'));
    EXPECT_EQ(refusal("most", Secrecy::Public), "");
    EXPECT_NE(refusal("more", Secrecy::Public).find("longer than 1 MiB"), std::string::npos);
}

TEST_F(FleetFiles, ALinkToNothingIsThere) {
    ASSERT_EQ(::symlink("nowhere", scratch.path("link").c_str()), 0);
    EXPECT_TRUE(fleet::isThere(scratch.path("link")));
    EXPECT_FALSE(fleet::isThere(scratch.path("nothing")));
}

}  // namespace
