#include "host/depot/obstacle.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>

#include "support/scratch_dir.h"

namespace {

class Obstacle : public testing::Test {
protected:
    Obstacle() {
        scratch_.makeDir("depot/folder/sub");
        scratch_.write("depot/plain", "x");
        link("folder", "depot/link");
        link("nowhere", "depot/dangling");
        link("round", "depot/round");
    }
    void link(const char* to, const char* from) const {
        EXPECT_EQ(::symlink(to, scratch_.path(from).c_str()), 0);
    }
    std::string at(const std::string& path) const {
        return host::obstacleAt(scratch_.path("depot"), path);
    }
    ScratchDir scratch_;
};

TEST_F(Obstacle, IsNotWhereAFileCanBeMadeOrReplaced) {
    for (const std::string& path :
         {std::string("new"), std::string("plain"), std::string("folder/new"),
          std::string("folder//sub/./new"), std::string("new/a/b"), std::string("link/new"),
          std::string("link"), std::string("dangling"), std::string("round"),
          std::string(255, 'n')})
        EXPECT_EQ(at(path), "") << path;
}

TEST_F(Obstacle, IsADirectoryInTheFilesPlace) {
    EXPECT_EQ(at("folder"), "a directory of that name is there");
    EXPECT_EQ(at("link/sub"), "a directory of that name is there");
    for (const char* path : {"", "folder/", "folder/.", "folder/sub/..", "new/"})
        EXPECT_EQ(at(path), "the name is that of a directory") << path;
}

TEST_F(Obstacle, IsAFileOrALooseLinkInADirectorysPlace) {
    EXPECT_EQ(at("plain/a"), "plain is no directory");
    EXPECT_EQ(at("plain/a/b"), "plain/a is no directory");
    EXPECT_EQ(at("dangling/a"), "dangling is a link that leads nowhere");
    EXPECT_EQ(at("round/a"), "round is a link that leads nowhere");
}

TEST_F(Obstacle, IsAPartThatNoFileSystemTakes) {
    EXPECT_EQ(at(std::string(256, 'n')), "a part of the name is too long");
    EXPECT_EQ(at("a/" + std::string(256, 'n') + "/b"), "a part of the name is too long");
}

TEST_F(Obstacle, IsADirectoryThatTheUserMayNotWriteTo) {
    if (::geteuid() == 0) {
        ASSERT_EQ(::seteuid(65534), 0);
        EXPECT_EQ(host::obstacleAt("/usr", "new"), "the host's user may not write to the depot");
        EXPECT_EQ(host::obstacleAt("/usr", "lib/new/a"), "the host's user may not write to lib");
        ASSERT_EQ(::seteuid(0), 0);
        return;
    }
    scratch_.makeDir("depot/closed");
    ASSERT_EQ(::chmod(scratch_.path("depot/closed").c_str(), 0500), 0);
    EXPECT_EQ(at("closed/a"), "the host's user may not write to closed");
}

TEST_F(Obstacle, IsNotLookedForInADepotThatCannotBeOpened) {
    EXPECT_EQ(host::obstacleAt(scratch_.path("none"), "a"), "");
}

}  // namespace
