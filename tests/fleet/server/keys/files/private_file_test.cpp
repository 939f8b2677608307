#include "fleet/server/keys/files/private_file.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <functional>
#include <string>

#include "fleet/server/keys/files/keys_error.h"
#include "tests/support/scratch_dir.h"

namespace {

namespace fs = std::filesystem;
using fleet::KeysError;
using fleet::readPrivateFile;
using fleet::Replacement;
using fleet::writeNewPrivateFile;
using fleet::writePrivateFile;

mode_t modeOfPath(const std::string& path) {
    struct stat found {};
    return ::stat(path.c_str(), &found) == 0 ? found.st_mode & 0777U : 0;
}

class PrivateFile : public testing::Test {
protected:
    std::string contentOf(const std::string& file) const {
        return std::string(readPrivateFile(file).view());
    }
    std::string refusal(const std::function<void()>& act) const {
        try {
            act();
            return "";
        } catch (const KeysError& error) {
            return error.what();
        }
    }

    const ScratchDir scratch_;
    const std::string file_ = scratch_.path("file");
};

TEST_F(PrivateFile, BelongsToItsOwnerAloneWhateverTheUmask) {
    const mode_t before = ::umask(0);
    writePrivateFile(file_, "content");
    writeNewPrivateFile(scratch_.path("new"), "content");
    fleet::makePrivateDirectory(scratch_.path("folder"));
    ::umask(before);
    EXPECT_EQ(modeOfPath(file_), mode_t{0600});
    EXPECT_EQ(modeOfPath(scratch_.path("new")), mode_t{0600});
    EXPECT_EQ(modeOfPath(scratch_.path("folder")), mode_t{0700});
    EXPECT_EQ(contentOf(file_), "content");
}

TEST_F(PrivateFile, IsReplacedAndNotWrittenInto) {
    writePrivateFile(file_, "older");
    fs::create_hard_link(file_, scratch_.path("link"));
    writePrivateFile(file_, "newer");
    EXPECT_EQ(contentOf(file_), "newer");
    EXPECT_EQ(contentOf(scratch_.path("link")), "older");
    EXPECT_FALSE(scratch_.exists("file.new"));
}

TEST_F(PrivateFile, IsAsItWasWhenTheProcessIsKilledBeforeTheReplacement) {
    writePrivateFile(file_, "older");
    const pid_t child = ::fork();
    if (child == 0) {
        const Replacement next(file_, "newer");
        ::kill(::getpid(), SIGKILL);
    }
    int status = 0;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    ASSERT_TRUE(WIFSIGNALED(status));
    EXPECT_EQ(scratch_.read("file.new"), "newer");  // it came that far
    EXPECT_EQ(contentOf(file_), "older");
    writePrivateFile(file_, "newest");
    EXPECT_EQ(contentOf(file_), "newest");
    EXPECT_FALSE(scratch_.exists("file.new"));
}

TEST_F(PrivateFile, IsAsItWasWhenTheReplacementIsNotCommitted) {
    writePrivateFile(file_, "older");
    { const Replacement next(file_, "newer"); }
    EXPECT_EQ(contentOf(file_), "older");
    EXPECT_FALSE(scratch_.exists("file.new"));
}

TEST_F(PrivateFile, IsNotMadeOverAnother) {
    writePrivateFile(file_, "older");
    EXPECT_NE(refusal([&] { writeNewPrivateFile(file_, "newer"); }).find("File exists"),
              std::string::npos);
    EXPECT_EQ(contentOf(file_), "older");
    fs::create_symlink(scratch_.path("elsewhere"), scratch_.path("link"));
    EXPECT_NE(refusal([&] { writeNewPrivateFile(scratch_.path("link"), "newer"); }), "");
    EXPECT_FALSE(scratch_.exists("elsewhere"));
}

TEST_F(PrivateFile, IsNotReadWhenOthersMay) {
    writePrivateFile(file_, "secret");
    for (const mode_t mode : {mode_t{0640}, mode_t{0604}, mode_t{0620}}) {
        ::chmod(file_.c_str(), mode);
        const std::string words = refusal([&] { readPrivateFile(file_); });
        EXPECT_NE(words.find("may be used by others"), std::string::npos);
        EXPECT_EQ(words.find("secret"), std::string::npos);
    }
}

TEST_F(PrivateFile, IsAFileOfReasonableSize) {
    EXPECT_NE(refusal([&] { readPrivateFile(scratch_.path()); }), "");
    EXPECT_NE(refusal([&] { readPrivateFile(file_); }), "");
    ASSERT_EQ(::mkfifo(file_.c_str(), 0600), 0);
    EXPECT_NE(refusal([&] { readPrivateFile(file_); }).find("is no file"), std::string::npos);
    writePrivateFile(scratch_.path("large"), std::string((4U << 20U) + 1, 'x'));
    EXPECT_NE(refusal([&] { readPrivateFile(scratch_.path("large")); }).find("is too large"),
              std::string::npos);
}

TEST_F(PrivateFile, StandsInADirectoryThatIsPrivateToo) {
    const std::string folder = scratch_.makeDir("folder");
    ::chmod(folder.c_str(), 0750);
    EXPECT_NE(refusal([&] { fleet::makePrivateDirectory(folder); }).find("mode 0700"),
              std::string::npos);
    EXPECT_EQ(modeOfPath(folder), mode_t{0750});
    EXPECT_NE(refusal([&] { fleet::requirePrivateDirectory(scratch_.path("missing")); }), "");
    writePrivateFile(file_, "");
    EXPECT_NE(refusal([&] { fleet::requirePrivateDirectory(file_); }).find("no directory"),
              std::string::npos);
}

}  // namespace
