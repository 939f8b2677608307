#include "host/depot/transfers/arrival_directory.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>

#include "support/scratch_dir.h"

namespace {

/// What stands in the way of a file.
std::string obstacleAt(const std::string& depot, const std::string& path) {
    const std::size_t file = path.rfind('/') + 1;  // npos + 1 is 0
    return host::ArrivalDirectory(depot, path.substr(0, file)).obstacleTo(path.substr(file));
}

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
        return obstacleAt(scratch_.path("depot"), path);
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
        EXPECT_EQ(obstacleAt("/usr", "new"), "the host's user may not write to the depot");
        EXPECT_EQ(obstacleAt("/usr", "lib/new/a"), "the host's user may not write to lib");
        ASSERT_EQ(::seteuid(0), 0);
        return;
    }
    scratch_.makeDir("depot/closed");
    ASSERT_EQ(::chmod(scratch_.path("depot/closed").c_str(), 0500), 0);
    EXPECT_EQ(at("closed/a"), "the host's user may not write to closed");
}

TEST_F(Obstacle, IsNotLookedForInADepotThatCannotBeOpened) {
    EXPECT_EQ(obstacleAt(scratch_.path("none"), "a"), "");
}

TEST_F(Obstacle, MayBeAFileThatIsReplaced) {
    const host::ArrivalDirectory directory(scratch_.path("depot"), "");
    EXPECT_EQ(directory.find("plain")->st_size, 1);
    EXPECT_TRUE(S_ISLNK(directory.find("dangling")->st_mode)) << "not what it leads to";
    EXPECT_FALSE(directory.find("none"));
    EXPECT_FALSE(host::ArrivalDirectory(scratch_.path("depot"), "none/").find("plain"));
}

TEST_F(Obstacle, LeadsOutByALinkOnTheWay) {
    link("..", "depot/folder/out");
    link("../..", "depot/folder/further");
    EXPECT_FALSE(host::ArrivalDirectory(scratch_.path("depot"), "folder/out/").leadsOut());
    EXPECT_TRUE(host::ArrivalDirectory(scratch_.path("depot"), "folder/further/").leadsOut());
    EXPECT_TRUE(host::ArrivalDirectory(scratch_.path("depot"), "folder/further/new/").leadsOut());
    EXPECT_EQ(host::ArrivalDirectory(scratch_.path("depot"), "folder/out/").realPath(),
              scratch_.path("depot"));
}

}  // namespace
