#include "ctl/client/transfer/pushed_file.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "ctl/client/failure.h"
#include "support/scratch_dir.h"

namespace {

using ctl::filesToPush;
using ctl::PushedFile;

std::vector<std::string> namesOf(const ctl::PushPlan& plan) {
    std::vector<std::string> names;
    for (const PushedFile& file : plan.files)
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
    const std::vector<PushedFile> files = filesToPush(source, "").files;
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

TEST(FilesToPush, NamesWhatAFolderHoldsBesideFiles) {
    const ScratchDir scratch;
    scratch.write("bundle/file", "x");
    scratch.makeDir("bundle/empty");
    scratch.makeDir("bundle/full/sub");
    ASSERT_EQ(::mkfifo(scratch.path("bundle/pipe").c_str(), 0600), 0);
    ASSERT_EQ(::symlink("file", scratch.path("bundle/to_file").c_str()), 0);
    ASSERT_EQ(::symlink("empty", scratch.path("bundle/to_folder").c_str()), 0);
    ASSERT_EQ(::symlink("nowhere", scratch.path("bundle/to_nothing").c_str()), 0);
    const ctl::PushPlan plan = filesToPush(scratch.path("bundle"), "");
    EXPECT_EQ(namesOf(plan), (Names{"bundle/file", "bundle/to_file"}));
    EXPECT_EQ(plan.skipped, (Names{"empty is not pushed: the folder is empty",
                                   "full/sub is not pushed: the folder is empty",
                                   "pipe is not pushed: it is a FIFO",
                                   "to_folder is not pushed: a link to a folder is not followed",
                                   "to_nothing is not pushed: the link leads nowhere"}));
}

TEST(FilesToPush, LeaveOutLinksThatLeadOutOfTheFolderUnlessTheyAreToBeFollowed) {
    const ScratchDir scratch;
    const std::string secret = scratch.write("secret", "x");
    scratch.write("bundle/file", "x");
    scratch.makeDir("bundle/sub");
    scratch.write("bundle-2/near", "x");
    ASSERT_EQ(::symlink("../secret", scratch.path("bundle/out").c_str()), 0);
    ASSERT_EQ(::symlink(secret.c_str(), scratch.path("bundle/sub/absolute").c_str()), 0);
    ASSERT_EQ(::symlink("../bundle-2/near", scratch.path("bundle/near").c_str()), 0);
    ASSERT_EQ(::symlink("../file", scratch.path("bundle/sub/inside").c_str()), 0);
    ASSERT_EQ(::symlink("bundle", scratch.path("alias").c_str()), 0);
    const auto note = [](const std::string& name, const std::string& target) {
        return name + " is not pushed: the link leads out of the folder, to " + target +
               "; --follow pushes that file";
    };
    for (const char* source : {"bundle", "alias"}) {
        const ctl::PushPlan plan = filesToPush(scratch.path(source), "b");
        EXPECT_EQ(namesOf(plan), (Names{"b/file", "b/sub/inside"}));
        EXPECT_EQ(plan.skipped, (Names{note("near", scratch.path("bundle-2/near")),
                                       note("out", secret), note("sub/absolute", secret)}));
    }
    const ctl::PushPlan all = filesToPush(scratch.path("bundle"), "b", ctl::Links::All);
    EXPECT_EQ(namesOf(all), (Names{"b/file", "b/near", "b/out", "b/sub/absolute", "b/sub/inside"}));
    EXPECT_EQ(all.skipped, Names{});
}

TEST(FilesToPush, FollowTheLinkThatIsNamed) {
    const ScratchDir scratch;
    scratch.write("elsewhere/file", "x");
    scratch.makeDir("here");
    ASSERT_EQ(::symlink("../elsewhere/file", scratch.path("here/link").c_str()), 0);
    EXPECT_EQ(namesOf(filesToPush(scratch.path("here/link"), "")), Names{"link"});
}

TEST(FilesToPush, OfAFolderOfWhichNothingIsPushedSaysWhy) {
    const ScratchDir scratch;
    scratch.write("secret", "x");
    scratch.makeDir("bundle");
    ASSERT_EQ(::symlink("../secret", scratch.path("bundle/out").c_str()), 0);
    try {
        filesToPush(scratch.path("bundle"), "");
        FAIL();
    } catch (const ctl::Failure& failure) {
        EXPECT_EQ(failure.what(), scratch.path("bundle") + " holds no files");
        EXPECT_NE(failure.hint().find("out is not pushed: "), std::string::npos) << failure.hint();
    }
}

TEST(PushedFile, IsPartialOnceSomethingOfItHasArrived) {
    PushedFile file;
    file.unanswered = 1;
    EXPECT_FALSE(file.isPartial()) << "nothing is known to have arrived";
    file.taken = 1;
    EXPECT_TRUE(file.isPartial());
    file.isSent = true;
    file.unanswered = 0;
    EXPECT_TRUE(file.isComplete());
    EXPECT_FALSE(file.isPartial());
    PushedFile refused;
    refused.isSent = true;
    refused.worst.status = 4;
    EXPECT_FALSE(refused.isPartial()) << "what is there is not of this push";
    refused.worst.status = 5;
    EXPECT_TRUE(refused.isPartial());
}

TEST(PathInDepot, HasSlashesOnly) {
    EXPECT_EQ(ctl::pathInDepot("a\\b/c"), "a/b/c");
    EXPECT_EQ(ctl::pathInDepot("\\/a"), "a");
    EXPECT_EQ(ctl::pathInDepot("/"), "");
}

TEST(LeadsOutOfDepot, CountsTheFolders) {
    for (const char* name : {"..", "../a", "a/../../b", "..\\a", "./.."})
        EXPECT_TRUE(ctl::leadsOutOfDepot(name)) << name;
    for (const char* name : {"a", "a/../b", "a/..b", "a//../b", ""})
        EXPECT_FALSE(ctl::leadsOutOfDepot(name)) << name;
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
