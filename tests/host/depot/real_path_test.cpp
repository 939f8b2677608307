#include "host/depot/real_path.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include "support/scratch_dir.h"

namespace {

TEST(RealPath, FollowsLinksAsFarAsThePathExists) {
    const ScratchDir scratch;
    scratch.write("real/sub/file", "x");
    ASSERT_EQ(::symlink("real", scratch.path("link").c_str()), 0);
    const std::string top = host::realPath(scratch.path());
    EXPECT_EQ(host::realPath(scratch.path("link/sub/file")), top + "/real/sub/file");
    EXPECT_EQ(host::realPath(scratch.path("link/none/below")), top + "/real/none/below");
    EXPECT_EQ(host::realPath(scratch.path("link/sub/")), top + "/real/sub");
    EXPECT_EQ(host::realPath(scratch.path("link/none/../sub")), top + "/real/sub");
    EXPECT_EQ(host::realPath("/"), "/");
    EXPECT_EQ(host::realPath(""), "");
}

TEST(IsWithin, ComparesWholeNames) {
    EXPECT_TRUE(host::isWithin("/a/b", "/a/b"));
    EXPECT_TRUE(host::isWithin("/a/b/c", "/a/b"));
    EXPECT_TRUE(host::isWithin("/a", "/"));
    EXPECT_FALSE(host::isWithin("/a/bc", "/a/b"));
    EXPECT_FALSE(host::isWithin("/a", "/a/b"));
    EXPECT_FALSE(host::isWithin("/a", ""));
}

}  // namespace
