#include "ctl/client/transfer/pushed_file.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include "ctl/client/failure.h"
#include "support/scratch_dir.h"

namespace {

using ctl::filesToPush;
using ctl::PushedFile;

std::vector<std::string> namesOf(const std::vector<PushedFile>& files) {
    std::vector<std::string> names;
    for (const PushedFile& file : files)
        names.push_back(file.name);
    return names;
}

std::string refusalOf(const std::string& source) {
    try {
        filesToPush(source, "");
    } catch (const ctl::Failure& failure) {
        EXPECT_EQ(failure.status(), ctl::kWrongUsage);
        return failure.what();
    }
    return "";
}

using Names = std::vector<std::string>;

TEST(PushedFile, IsTakenUntilTheHostRefusesPartOfIt) {
    PushedFile file;
    EXPECT_TRUE(file.wasTaken());
    file.worst = {4, 0};
    EXPECT_FALSE(file.wasTaken());
    file.worst = {0, 0x000006F7};
    EXPECT_FALSE(file.wasTaken());
}

TEST(FilesToPush, OfOneFileIsThatFileUnderTheNameThatWasAskedFor) {
    const ScratchDir scratch;
    const std::string source = scratch.write("a.tar", "content");
    EXPECT_EQ(namesOf(filesToPush(source, "")), Names{"a.tar"});
    EXPECT_EQ(namesOf(filesToPush(source, "b.tar")), Names{"b.tar"});
    EXPECT_EQ(namesOf(filesToPush(source, "ux/7.1/")), Names{"ux/7.1/a.tar"});
    const std::vector<PushedFile> files = filesToPush(source, "");
    EXPECT_EQ(files[0].source, source);
    EXPECT_EQ(files[0].size, 7U);
}

TEST(FilesToPush, OfAFolderAreTheFilesBelowItInOrder) {
    const ScratchDir scratch;
    scratch.makeDir("bundle/sub");
    scratch.makeDir("bundle/empty");
    scratch.write("bundle/z", "1");
    scratch.write("bundle/sub/a", "22");
    const std::string source = scratch.path("bundle");
    EXPECT_EQ(namesOf(filesToPush(source, "")), (Names{"bundle/sub/a", "bundle/z"}));
    EXPECT_EQ(namesOf(filesToPush(source + "//", "ux/7.1")), (Names{"ux/7.1/sub/a", "ux/7.1/z"}));
    EXPECT_EQ(namesOf(filesToPush(source, "ux/")), (Names{"ux/bundle/sub/a", "ux/bundle/z"}));
}

TEST(FilesToPush, SaysWhatCannotBePushed) {
    const ScratchDir scratch;
    EXPECT_EQ(refusalOf(scratch.path("none")), "there is no " + scratch.path("none"));
    EXPECT_EQ(refusalOf("/dev/null"), "/dev/null is no regular file");
    scratch.makeDir("empty");
    EXPECT_EQ(refusalOf(scratch.path("empty")), scratch.path("empty") + " holds no files");
    EXPECT_EQ(refusalOf(scratch.write("a\\b", "")),
              "a name with a backslash cannot be pushed: a\\b");
}

}  // namespace
