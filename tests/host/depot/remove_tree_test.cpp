#include "host/depot/remove_tree.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>

#include "support/scratch_dir.h"
#include "system/file_descriptor.h"

namespace {

class RemoveTree : public testing::Test {
protected:
    int remove(const std::string& name) const {
        const sys::FileDescriptor parent(::open(scratch_.path().c_str(), O_PATH | O_CLOEXEC));
        return host::removeTree(parent.get(), name);
    }
    ScratchDir scratch_;
};

TEST_F(RemoveTree, RemovesADirectoryWithEverythingInIt) {
    for (int i = 0; i < 50; ++i)
        scratch_.write("tree/" + std::to_string(i % 5) + "/sub/" + std::to_string(i), "x");
    scratch_.makeDir("tree/empty");
    scratch_.write("other", "stays");
    EXPECT_EQ(remove("tree"), 0);
    EXPECT_FALSE(scratch_.exists("tree"));
    EXPECT_TRUE(scratch_.exists("other"));
}

TEST_F(RemoveTree, RemovesLinksAndNotWhatTheyPointTo) {
    scratch_.write("outside/file", "stays");
    scratch_.makeDir("tree");
    ASSERT_EQ(::symlink("../outside", scratch_.path("tree/link").c_str()), 0);
    ASSERT_EQ(::symlink("outside", scratch_.path("itself").c_str()), 0);
    EXPECT_EQ(remove("tree"), 0);
    EXPECT_NE(remove("itself"), 0) << "a link is no directory";
    EXPECT_TRUE(scratch_.exists("outside/file"));
}

TEST_F(RemoveTree, SaysWhatIsWrong) {
    EXPECT_EQ(remove("none"), ENOENT);
    scratch_.write("file", "x");
    EXPECT_EQ(remove("file"), ENOTDIR);
    std::string deep = "tree";
    for (int i = 0; i < 250; ++i)
        deep += "/d";
    scratch_.makeDir(deep);
    EXPECT_EQ(remove("tree"), ENAMETOOLONG);
}

}  // namespace
