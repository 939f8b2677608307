#include "host/home/parameter_copy.h"

#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <csignal>
#include <filesystem>
#include <system_error>

#include "support/scratch_dir.h"

namespace {

using host::isCutOff;
using host::ParameterCopy;

const std::string kBefore =
    "|DATAPROVIDER|FILE|\n\nother|CONSOLEPORT|7701|\ninst|DATAPROVIDER|ASFS,HTTP|\nlast|X|1|\n";
const std::string kAfter =
    "|DATAPROVIDER|FILE,SCRP|\nother|CONSOLEPORT|7701|\n|DATAPROVIDER|FILE,SCRP|\nlast|X|1|\n";

TEST(CutOff, IsEveryBeginningOfARewritingButNeitherTheOldTextNorTheNewOne) {
    EXPECT_FALSE(isCutOff(kBefore, kBefore));
    EXPECT_FALSE(isCutOff(kAfter, kBefore));
    // The line feed at the end is nothing that anybody would miss.
    const std::size_t lastNeeded = kAfter.size() - 1;
    for (std::size_t length = 0; length < lastNeeded; ++length)
        EXPECT_TRUE(isCutOff(kAfter.substr(0, length), kBefore)) << kAfter.substr(0, length);
    for (std::size_t length = 0; length < kBefore.find("\n\n"); ++length)
        EXPECT_TRUE(isCutOff(kBefore.substr(0, length), kBefore)) << length;
}

TEST(CutOff, IsNotWhatSomebodyHasEdited) {
    for (const char* edited : {"another|CONSOLEPORT|7702|\n", "|CONSOLEPORT|1|\nother|Y|2|\n",
                               "|DATAPROVIDER|FILE|\n\nmore|Z|3|\n", "* a comment\n"})
        EXPECT_FALSE(isCutOff(edited, kBefore)) << edited;
    EXPECT_FALSE(isCutOff(kBefore + "more|Z|3|\n", kBefore));
    EXPECT_FALSE(isCutOff("text", ""));
}

class SavedParameters : public testing::Test {
protected:
    std::string text() const { return home.read(kFile); }
    bool hasCopy() const { return home.exists(kCopy); }
    void damage(const std::string& left) const { home.write(kFile, left); }
    mode_t modeOf(const char* name) const {
        struct stat found {};
        EXPECT_EQ(::stat(home.path(name).c_str(), &found), 0) << name;
        return found.st_mode & 07777U;
    }

    static constexpr const char* kFile = "config/.ConfigData/kumenv";
    static constexpr const char* kCopy = "config/.ConfigData/.kumenv.saved";
    const ScratchDir home;
    const std::string file = home.write(kFile, kBefore, 0640);
    const ParameterCopy copy{home.path()};
};

TEST_F(SavedParameters, AreRestoredWhenTheFileIsGone) {
    copy.save();
    EXPECT_EQ(text(), kBefore) << "the file stays as it is";
    std::filesystem::remove(file);
    EXPECT_TRUE(copy.restore());
    EXPECT_EQ(text(), kBefore);
    EXPECT_EQ(modeOf(kFile), 0640U);
    EXPECT_FALSE(hasCopy());
}

TEST_F(SavedParameters, AreRestoredWhereverTheFileIsCut) {
    for (std::size_t length = 0; length < kAfter.size() - 1; ++length) {
        copy.save();
        damage(kAfter.substr(0, length));
        EXPECT_TRUE(copy.restore()) << length;
        ASSERT_EQ(text(), kBefore) << length;
    }
}

TEST_F(SavedParameters, AreDroppedWhenTheFileIsWhole) {
    for (const std::string& whole : {kBefore, kAfter, std::string("somebody's own\n")}) {
        copy.save();
        damage(whole);
        EXPECT_FALSE(copy.restore());
        EXPECT_EQ(text(), whole);
        EXPECT_FALSE(hasCopy());
        damage(kBefore);
    }
}

TEST_F(SavedParameters, AreTheLastOnes) {
    copy.save();
    damage(kAfter);
    copy.save();
    std::filesystem::remove(file);
    EXPECT_TRUE(copy.restore());
    EXPECT_EQ(text(), kAfter);
}

TEST_F(SavedParameters, ThatWereDroppedRestoreNothing) {
    copy.save();
    copy.drop();
    std::filesystem::remove(file);
    EXPECT_FALSE(copy.restore());
    EXPECT_FALSE(home.exists(kFile));
}

TEST_F(SavedParameters, OfAHomeWithoutThemAreNone) {
    std::filesystem::remove(file);
    copy.save();
    EXPECT_FALSE(hasCopy());
    EXPECT_FALSE(copy.restore());
    EXPECT_FALSE(home.exists(kFile));
    const ScratchDir bare;
    const ParameterCopy ofNothing(bare.path());
    ofNothing.save();
    ofNothing.drop();
    EXPECT_FALSE(ofNothing.restore());
}

TEST_F(SavedParameters, AreNoLinkAndNoPipe) {
    std::filesystem::remove(file);
    const std::string private_ = home.write("private", "secret", 0600);
    std::filesystem::create_symlink(private_, file);
    copy.save();
    EXPECT_FALSE(hasCopy());
    std::filesystem::remove(file);
    ASSERT_EQ(::mkfifo(file.c_str(), 0600), 0);
    copy.save();
    EXPECT_FALSE(hasCopy());
}

TEST_F(SavedParameters, ThatAHostWasKilledInWritingAreIgnored) {
    home.write("config/.ConfigData/.kumenv.saved.new", "|DATAP");
    EXPECT_FALSE(copy.restore());
    EXPECT_FALSE(home.exists("config/.ConfigData/.kumenv.saved.new"));
    EXPECT_EQ(text(), kBefore);
}

TEST_F(SavedParameters, ThatCannotBeKeptAreAnError) {
    home.makeDir("config/.ConfigData/.kumenv.saved/in the way");
    EXPECT_THROW(copy.save(), std::system_error);
    EXPECT_EQ(text(), kBefore);
}

TEST_F(SavedParameters, StayTheOlderOnesWhereverTheDiskIsFull) {
    copy.save();
    damage(kAfter);
    std::signal(SIGXFSZ, SIG_IGN);  // as on a full disk, writing beyond the limit is an error then
    rlimit usual{};
    ASSERT_EQ(::getrlimit(RLIMIT_FSIZE, &usual), 0);
    for (rlim_t room = 0; room < kAfter.size(); ++room) {
        const rlimit little{room, usual.rlim_max};
        ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &little), 0);
        EXPECT_THROW(copy.save(), std::system_error);
        ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &usual), 0);
        ASSERT_EQ(home.read(kCopy), kBefore) << room;
    }
    EXPECT_EQ(text(), kAfter);
    copy.save();
    EXPECT_EQ(home.read(kCopy), kAfter);
}

}  // namespace
