#include "platform/fsi1.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <map>
#include <string>

#include "support/scratch_dir.h"

namespace {

class Listing : public testing::Test {
protected:
    /// The entries by path; the listing must end properly.
    std::map<std::string, FSI1_ENTRY> list(const std::string& directory) {
        std::map<std::string, FSI1_ENTRY> found;
        FSI1_LIST* listing = nullptr;
        EXPECT_EQ(FSI1_OK, FSI1_NewList(directory.c_str(), &listing));
        FSI1_ENTRY entry{};
        int result = FSI1_FetchList(listing, &entry);
        for (; result == FSI1_OK; result = FSI1_FetchList(listing, &entry)) {
            found[entry.path] = entry;
        }
        EXPECT_EQ(FSI1_END_OF_LIST, result);
        EXPECT_EQ(FSI1_END_OF_LIST, FSI1_FetchList(listing, &entry));
        EXPECT_EQ(FSI1_OK, FSI1_DeleteList(listing));
        return found;
    }
    void setTime(const std::string& path, time_t seconds) {
        const timespec times[2] = {{seconds, 0}, {seconds, 0}};
        ASSERT_EQ(0, ::utimensat(AT_FDCWD, path.c_str(), times, 0));
    }

    ScratchDir scratch;
};

TEST_F(Listing, AnEmptyDirectoryHasNoEntries) {
    EXPECT_TRUE(list(scratch.path()).empty());
}

TEST_F(Listing, FilesAndDirectoriesAreListedWithPathTimeAndKind) {
    setTime(scratch.write("a.log", "text"), 1000000000);
    scratch.makeDir("sub");
    scratch.write("sub/inner", "");
    const auto found = list(scratch.path());
    ASSERT_EQ(2U, found.size());
    const FSI1_ENTRY& file = found.at(scratch.path("a.log"));
    EXPECT_FALSE(file.isDirectory);
    EXPECT_EQ(1000000000, file.timeStamp);
    EXPECT_TRUE(found.at(scratch.path("sub")).isDirectory);
}

TEST_F(Listing, HiddenFilesAreListed) {
    scratch.write(".hidden", "");
    scratch.write("..twodots", "");
    EXPECT_EQ(2U, list(scratch.path()).size());
}

TEST_F(Listing, ASlashAtTheEndIsNotDoubled) {
    scratch.write("a", "");
    EXPECT_EQ(1U, list(scratch.path() + "/").count(scratch.path("a")));
}

TEST_F(Listing, LinksAreFollowedIfTheyLeadAnywhere) {
    scratch.makeDir("sub");
    ASSERT_EQ(0, ::symlink("sub", scratch.path("good").c_str()));
    ASSERT_EQ(0, ::symlink("nowhere", scratch.path("dangling").c_str()));
    ASSERT_EQ(0, ::symlink("circle", scratch.path("circle").c_str()));
    const auto found = list(scratch.path());
    ASSERT_EQ(4U, found.size());
    EXPECT_TRUE(found.at(scratch.path("good")).isDirectory);
    EXPECT_FALSE(found.at(scratch.path("dangling")).isDirectory);
    EXPECT_FALSE(found.at(scratch.path("circle")).isDirectory);
}

TEST_F(Listing, EveryFileOfALargeDirectoryIsListedOnce) {
    for (int i = 0; i < 2000; ++i)
        scratch.write("f" + std::to_string(i), "");
    EXPECT_EQ(2000U, list(scratch.path()).size());
}

TEST_F(Listing, AnEntryThatVanishesMeanwhileIsLeftOut) {
    const std::string path = scratch.write("gone", "");
    FSI1_LIST* listing = nullptr;
    ASSERT_EQ(FSI1_OK, FSI1_NewList(scratch.path().c_str(), &listing));
    ASSERT_EQ(0, ::unlink(path.c_str()));
    FSI1_ENTRY entry{};
    EXPECT_EQ(FSI1_END_OF_LIST, FSI1_FetchList(listing, &entry));
    FSI1_DeleteList(listing);
}

TEST_F(Listing, WhatCannotBeOpenedSaysWhyAndGivesNoHandle) {
    FSI1_LIST* listing = reinterpret_cast<FSI1_LIST*>(this);
    EXPECT_EQ(ENOENT, FSI1_NewList(scratch.path("none").c_str(), &listing));
    EXPECT_EQ(nullptr, listing);
    EXPECT_EQ(ENOENT, FSI1_NewList("", &listing));
    EXPECT_EQ(ENOTDIR, FSI1_NewList(scratch.write("file", "").c_str(), &listing));
    EXPECT_EQ(EINVAL, FSI1_NewList(nullptr, &listing));
    EXPECT_EQ(nullptr, listing);
}

TEST_F(Listing, NoHandleIsAnError) {
    FSI1_ENTRY entry{};
    EXPECT_EQ(EINVAL, FSI1_FetchList(nullptr, &entry));
    EXPECT_EQ(EINVAL, FSI1_DeleteList(nullptr));
}

TEST_F(Listing, LeavesNoDescriptorBehind) {
    const int before = ::dup(0);
    ::close(before);
    for (int i = 0; i < 100; ++i)
        list(scratch.path());
    const int after = ::dup(0);
    ::close(after);
    EXPECT_EQ(before, after);
}

TEST_F(Listing, PathsThatDoNotFitAreLeftOut) {
    // A directory whose own path leaves room for 100 more bytes; longer names are made by way of
    // its descriptor.
    std::string deep = scratch.path();
    while (deep.size() < 3996) {
        deep += "/" + std::string(std::min<std::size_t>(200, 3996 - deep.size() - 1), 'd');
        ASSERT_EQ(0, ::mkdir(deep.c_str(), 0755));
    }
    const int directory = ::open(deep.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    ASSERT_NE(-1, directory);
    for (const std::size_t length : {std::size_t{98}, std::size_t{99}, std::size_t{255}}) {
        const std::string name(length, 'f');
        const int made = ::openat(directory, name.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0644);
        ASSERT_NE(-1, made);
        ::close(made);
    }
    ::close(directory);
    const auto found = list(deep);
    ASSERT_EQ(1U, found.size());
    EXPECT_EQ(4095U, found.begin()->first.size());
}

}  // namespace
