// Reading, writing and copying whole files, property files and directory trees, whose calls of the
// system fail one after the other.
#include <gmock/gmock.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>

#include "base/zavrbndl.h"
#include "faults/scenario.h"
#include "support/scratch_dir.h"
#include "tasks/whole_file.h"
#include "util/zavutil.h"

using namespace faults;
using ZAV::String;
using ZAV::Util;

namespace {

using Texts = std::vector<std::string>;

class FileFaults : public testing::Test {
protected:
    static std::string found(int rc, const char* text) {
        return std::to_string(rc) + " [" + (text != nullptr ? text : "null") + "]";
    }

    Scenario reading() const {
        const auto run = [=] {
            char* text = nullptr;
            const int rc = Util::readFile(file_.c_str(), &text);
            const std::string result = found(rc, text);
            std::free(text);
            return result;
        };
        return Scenario([] {}, run, {"0 [key=value]", {}});
    }
    Scenario properties() const {
        const auto run = [=]() -> std::string {
            try {
                const ZAV::ResourceBundle bundle(file_.c_str(), '*');
                return narrow(*bundle.getValue("key"));
            } catch (const ZAV::ResourceBundleException& exception) {
                return "thrown: " + narrow(exception.getErrorMessage());
            }
        };
        return Scenario([] {}, run, {"value", {}});
    }
    Scenario readingText() const {
        return Scenario([] {}, [=] { return narrow(readFile(file_.c_str())); }, {"key=value", {}});
    }
    Scenario writingText(const std::string& text) const {
        const auto run = [=] {
            const int result = writeFile(other_.c_str(), text.c_str());
            return std::to_string(result) + " [" + scratch_.read("other") + "]";
        };
        return Scenario([=] { std::filesystem::remove(other_); }, run, {"1 [" + text + "]", {}});
    }
    /// The result names the number of bytes that have arrived.
    Scenario copying(std::size_t size) const {
        const auto prepare = [=] {
            scratch_.write("source", std::string(size, 'x'));
            std::filesystem::remove(other_);
        };
        const auto run = [=] {
            const int rc = Util::_copyFile(scratch_.path("source").c_str(), other_.c_str());
            return std::to_string(rc) + " " + std::to_string(scratch_.read("other").size());
        };
        return Scenario(prepare, run, {"0 " + std::to_string(size), {}});
    }
    Scenario makingDirectories() const {
        const auto prepare = [=] { std::filesystem::remove_all(scratch_.path("a")); };
        const auto run = [=] {
            return std::to_string(Util::createDir(scratch_.path("a/b").c_str()));
        };
        return Scenario(prepare, run, {"0", {}});
    }
    End copyFailure(const std::string& what, int error) const {
        return {std::to_string(error) + " 0", {what + std::strerror(error)}};
    }

    ScratchDir scratch_;
    std::string file_ = scratch_.write("file", "key=value");
    std::string other_ = scratch_.path("other");
};

TEST_F(FileFaults, ReadingGivesTheReason) {
    Scenario scenario = reading();
    for (const int error : {EMFILE, EACCES})
        scenario.expectEach(Call::kOpen, error, {{found(error, nullptr), {}}});
    scenario.expectEach(Call::kFstat, EIO, {{found(EIO, nullptr), {}}, {found(EIO, nullptr), {}}});
    scenario.expectEach(Call::kLseek, EIO, {{found(EIO, nullptr), {}}, {found(EIO, nullptr), {}}});
    scenario.expectEach(Call::kRead, EIO, {{found(EIO, nullptr), {}}});
    scenario.expectEach(Call::kClose, EIO, {scenario.unharmed()});
}

TEST_F(FileFaults, ReadingWithoutMemoryIsTraced) {
    if (!kMemoryIsOurs) GTEST_SKIP() << "the sanitizer owns malloc";
    reading().expectEach(Call::kMalloc, ENOMEM,
                         {{found(ENOMEM, nullptr), {"Unable to read file: " + file_}}});
}

TEST_F(FileFaults, PropertiesThatCannotBeReadAreAnException) {
    Scenario scenario = properties();
    const End thrown{"thrown: Unable to read file: " + file_, {}};
    scenario.expectEach(Call::kOpen, EMFILE, {thrown});
    scenario.expectEach(Call::kFstat, EIO, {thrown, thrown});
    scenario.expectEach(Call::kLseek, EIO, {thrown, thrown});
    scenario.expectEach(Call::kRead, EIO, {thrown});
    scenario.expectEach(Call::kClose, EIO, {scenario.unharmed()});
    if (!kMemoryIsOurs) return;
    scenario.expectEach(Call::kMalloc, ENOMEM,
                        {{thrown.result, {"Unable to read file: " + file_}}});
}

TEST_F(FileFaults, ATextThatCannotBeReadIsEmpty) {
    Scenario scenario = readingText();
    const End closed{"",
                     {"Failed to open file " + file_ + " using mode \"rb\", check permissions"}};
    for (const int error : {EMFILE, EACCES})
        scenario.expectEach(Call::kOpen, error, {closed});
    scenario.expectEach(Call::kFdopen, ENOMEM, {closed});
    // A read that brings nothing is the end of the file, whatever the reason.
    scenario.expectEach(Call::kFread, EIO, {{"", {}}, scenario.unharmed()});
    scenario.expectEach(
        Call::kFclose, EIO,
        {{scenario.unharmed().result, {"Failed to close stream for file " + file_}}});
}

TEST_F(FileFaults, ATextThatCannotBeWrittenIsZero) {
    Scenario scenario = writingText("some text");
    const End closed{"0 []",
                     {"Failed to open file " + other_ + " using mode \"rb\", check permissions"}};
    for (const int error : {EMFILE, EACCES, EROFS, ENOSPC})
        scenario.expectEach(Call::kOpen, error, {closed});
    scenario.expectEach(Call::kFdopen, ENOMEM, {closed});
    scenario.expectEach(Call::kFclose, ENOSPC,
                        {{"0 [some text]", {"Failed to close stream for file " + other_}}});
}

TEST_F(FileFaults, AWriteThatTakesNothingEndsTheTextWithoutBeingAFailure) {
    writingText("some text").expectEach(Call::kFwrite, ENOSPC, {{"1 []", {}}});
}

TEST_F(FileFaults, CopyingNamesTheStepThatFailed) {
    Scenario scenario = copying(5000);
    const std::string source = scratch_.path("source");
    for (const int error : {EMFILE, EACCES}) {
        scenario.expectEach(Call::kOpen, error,
                            {copyFailure("Failed to open source file " + source +
                                             " using mode \"rb\", check permissions, error code: ",
                                         error),
                             copyFailure("Failed to open destination file " + other_ +
                                             " using mode \"wb\", check permissions, error code: ",
                                         error)});
    }
    const End unread = copyFailure("Error reading from file " + source + ", error code: ", EIO);
    EXPECT_EQ(scenario.endWith(Call::kRead, 1, EIO), unread);
    EXPECT_EQ(scenario.endWith(Call::kRead, 6, EIO), (End{"5 5000", unread.errors}));
    // What does not fit the buffer shows while writing, the rest when the file is closed.
    scenario.expectEach(Call::kWrite, ENOSPC,
                        {copyFailure("Error writing to file " + other_ + ", error code: ", ENOSPC),
                         {"28 4096",
                          {"Failed to close stream for file " + other_ +
                           ", error code: " + std::strerror(ENOSPC)}}});
    const auto unclosed = [&](const std::string& path) {
        return End{
            "5 5000",
            {"Failed to close stream for file " + path + ", error code: " + std::strerror(EIO)}};
    };
    scenario.expectEach(Call::kClose, EIO, {unclosed(source), unclosed(other_)});
}

TEST_F(FileFaults, DirectoriesThatCannotBeMadeGiveTheReason) {
    Scenario scenario = makingDirectories();
    for (const int error : {ENOSPC, EACCES, EROFS, EMLINK}) {
        const auto failed = [&](const char* directory) {
            return End{
                std::to_string(error),
                {"Failed to make directory " + scratch_.path(directory) + ", return code status"}};
        };
        scenario.expectEach(Call::kMkdir, error, {failed("a"), failed("a/b")});
    }
}

TEST_F(FileFaults, DirectoriesWithoutMemoryAreTwo) {
    if (!kMemoryIsOurs) GTEST_SKIP() << "the sanitizer owns malloc";
    Scenario scenario = makingDirectories();
    const End end = scenario.endWith(Call::kMalloc, 1, ENOMEM);
    EXPECT_EQ(end.result, "2");
    ASSERT_EQ(end.errors.size(), 1u);
    EXPECT_THAT(end.errors[0], testing::MatchesRegex("Malloc of [0-9]+ bytes failed"));
}

TEST_F(FileFaults, RemovingGivesTheReason) {
    Scenario scenario([=] { scratch_.write("other", ""); },
                      [=] { return std::to_string(deleteFile(other_.c_str())); }, {"1", {}});
    scenario.expectEach(
        Call::kUnlink, EACCES,
        {{"0", {"Failed to delete file " + other_ + " error was: " + std::strerror(EACCES)}}});
    Scenario utility([=] { scratch_.write("other", ""); },
                     [=] { return std::to_string(Util::deleteFile(other_.c_str())); }, {"1", {}});
    utility.expectEach(Call::kUnlink, EACCES,
                       {{"0", {"Error deleting [" + other_ + "]: " + std::strerror(EACCES)}}});
}

TEST_F(FileFaults, AHostWithoutANameHasAnEmptyOne) {
    Scenario scenario([] {}, [] { return narrow(Util::getHostName()).empty() ? "" : "named"; },
                      {"named", {}});
    scenario.expectEach(Call::kUname, EFAULT, {{"", {}}});
}

}  // namespace
