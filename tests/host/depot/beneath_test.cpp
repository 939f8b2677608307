#include "host/depot/beneath.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "support/scratch_dir.h"

namespace {

using sys::FileDescriptor;

using Opener = sys::FileDescriptor (*)(int root, const std::string& path, int flags);

/// Both ways must answer alike.
class Beneath : public testing::TestWithParam<Opener> {
protected:
    Beneath() {
        scratch_.write("secret", "outside");
        scratch_.write("root/file", "inside");
        scratch_.write("root/sub/deep/file", "deep");
        link("deep", "root/sub/inner");
        link("sub/../file", "root/around");
        link("sub/inner/", "root/slashed");
        link("../secret", "root/escape");
        link("..", "root/sub/up");
        link(scratch_.path("root/file"), "root/absolute");
        link("loop", "root/loop");
        link("nowhere", "root/dangling");
        root_ = sys::FileDescriptor(::open(scratch_.path("root").c_str(), O_PATH | O_CLOEXEC));
    }
    void link(const std::string& target, const std::string& name) const {
        ASSERT_EQ(::symlink(target.c_str(), scratch_.path(name).c_str()), 0);
    }
    /// The content, or the name of the error.
    std::string read(const std::string& path, int flags = O_RDONLY) const {
        errno = 0;
        const sys::FileDescriptor opened = GetParam()(root_.get(), path, flags);
        if (!opened)
            return errno == EXDEV     ? "EXDEV"
                   : errno == ELOOP   ? "ELOOP"
                   : errno == ENOENT  ? "ENOENT"
                   : errno == ENOTDIR ? "ENOTDIR"
                                      : "?";
        struct stat found {};
        ::fstat(opened.get(), &found);
        if (S_ISDIR(found.st_mode)) return "directory";
        if (S_ISLNK(found.st_mode)) return "link";
        char content[100];
        const ssize_t length = ::read(opened.get(), content, sizeof content);
        return std::string(content, length < 0 ? 0 : static_cast<std::size_t>(length));
    }

    ScratchDir scratch_;
    sys::FileDescriptor root_;
};

TEST_P(Beneath, OpensWhatStandsBelow) {
    EXPECT_EQ(read("file"), "inside");
    EXPECT_EQ(read("sub/deep/file"), "deep");
    EXPECT_EQ(read("./sub//deep/./file"), "deep");
    EXPECT_EQ(read("sub/deep/../../file"), "inside");
    EXPECT_EQ(read("."), "directory");
    EXPECT_EQ(read("sub/"), "directory");
}

TEST_P(Beneath, FollowsLinksThatStayInside) {
    EXPECT_EQ(read("sub/inner/file"), "deep");
    EXPECT_EQ(read("around"), "inside");
    EXPECT_EQ(read("slashed/file"), "deep");
    EXPECT_EQ(read("sub/up/file"), "inside");
    EXPECT_EQ(read("sub/inner"), "directory");
}

TEST_P(Beneath, RefusesWhatLeadsOut) {
    for (const char* path : {"..", "../secret", "sub/../../secret", "escape", "sub/up/../secret",
                             "/etc/passwd", "absolute"}) {
        EXPECT_EQ(read(path), "EXDEV") << path;
    }
}

TEST_P(Beneath, LeavesTheLastLinkAloneWhenAsked) {
    EXPECT_EQ(read("escape", O_PATH | O_NOFOLLOW), "link");
    EXPECT_EQ(read("sub/inner", O_PATH | O_NOFOLLOW), "link");
    EXPECT_EQ(read("sub/inner/", O_PATH | O_NOFOLLOW), "directory");
}

TEST_P(Beneath, SaysWhatIsWrong) {
    EXPECT_EQ(read("none"), "ENOENT");
    EXPECT_EQ(read("none/file"), "ENOENT");
    EXPECT_EQ(read("dangling"), "ENOENT");
    EXPECT_EQ(read("loop"), "ELOOP");
    EXPECT_EQ(read("file/below"), "ENOTDIR");
    EXPECT_EQ(read("file/"), "ENOTDIR");
}

INSTANTIATE_TEST_SUITE_P(ByTheKernelAndByHand, Beneath,
                         testing::Values(&host::openBeneath, &host::walkBeneath));

TEST(WalkBeneath, EndsWhenDirectoriesLieTooDeep) {
    const ScratchDir scratch;
    std::string path;
    for (int i = 0; i < 300; ++i)
        path += "d/";
    scratch.makeDir("root/" + path);
    const sys::FileDescriptor root(::open(scratch.path("root").c_str(), O_PATH | O_CLOEXEC));
    EXPECT_FALSE(host::walkBeneath(root.get(), path, O_RDONLY));
    EXPECT_EQ(errno, ENAMETOOLONG);
}

}  // namespace
