#include "tasks/whole_file.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <vector>

#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "support/units.h"

using testing::ElementsAre;
using testing::IsEmpty;
using ZAV::String;

// These definitions replace the C library's, so that streams can be made to fail.
namespace {
int reportedStreamError = 0;
bool closingFails = false;
bool writesAreShort = false;
int lastClosed = -1;  // the descriptor of the stream
// Counters of coverage are read and written after the end of main.
std::vector<std::size_t>& chunksRead = *new std::vector<std::size_t>;

template <typename Function>
Function next(const char* name) {
    return reinterpret_cast<Function>(::dlsym(RTLD_NEXT, name));
}
}  // namespace

extern "C" int ferror(std::FILE* stream) noexcept {
    if (reportedStreamError != 0) return reportedStreamError;
    return next<int (*)(std::FILE*)>("ferror")(stream);
}

extern "C" std::size_t fread(void* buffer, std::size_t size, std::size_t count, std::FILE* stream) {
    using Fread = std::size_t (*)(void*, std::size_t, std::size_t, std::FILE*);
    chunksRead.push_back(next<Fread>("fread")(buffer, size, count, stream));
    return chunksRead.back();
}

extern "C" std::size_t fwrite(const void* data, std::size_t size, std::size_t count,
                              std::FILE* stream) {
    using Fwrite = std::size_t (*)(const void*, std::size_t, std::size_t, std::FILE*);
    const std::size_t taken = writesAreShort ? std::min<std::size_t>(count, 100) : count;
    return next<Fwrite>("fwrite")(data, size, taken, stream);
}

extern "C" int fclose(std::FILE* stream) {
    lastClosed = ::fileno(stream);
    const int result = next<int (*)(std::FILE*)>("fclose")(stream);
    return closingFails ? EOF : result;
}

namespace {

class WholeFile : public testing::Test {
protected:
    ~WholeFile() override {
        reportedStreamError = 0;
        closingFails = false;
        writesAreShort = false;
    }

    String path(const std::string& name) const { return scratch_.path(name).c_str(); }
    String written(const std::string& name, const std::string& content) const {
        return scratch_.write(name, content).c_str();
    }

    ScratchDir scratch_;
    TraceCapture trace_{"ERROR (UNIT:zavtasks ALL)"};
};

std::string sampleText(std::size_t length) {
    std::string text;
    text.reserve(length);
    while (text.size() < length)
        text += static_cast<char>('a' + text.size() % 23);
    return text;
}

TEST_F(WholeFile, ReadsTextsOfAnyLength) {
    for (const unsigned length : {1u, 1023u, 1024u, 1025u, 2048u, 5000u}) {
        const std::string text = sampleText(length);
        EXPECT_EQ(narrow(readFile(written("f", text))), text) << length;
    }
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(WholeFile, ReadsUntilAChunkIsEmpty) {
    const String exact = written("f", sampleText(1024));
    const String longer = written("g", sampleText(1025));
    chunksRead.clear();
    readFile(exact);
    EXPECT_THAT(chunksRead, ElementsAre(1024u, 0u));
    chunksRead.clear();
    readFile(longer);
    EXPECT_THAT(chunksRead, ElementsAre(1024u, 1u, 0u));
}

TEST_F(WholeFile, ReadsLineEndsAsTheyAre) {
    EXPECT_EQ(narrow(readFile(written("f", "a\r\nb\n\nc"))), "a\r\nb\n\nc");
}

TEST_F(WholeFile, ReadsAndWritesMegabytes) {
    const std::string text = sampleText(8 << 20);
    const String read = readFile(written("f", text));
    EXPECT_EQ(narrow(read), text);
    EXPECT_EQ(writeFile(path("g"), read), 1);
    EXPECT_EQ(scratch_.read("g"), text);
}

TEST_F(WholeFile, MissingFilesAreEmpty) {
    EXPECT_TRUE(readFile(path("none")) == "");
    EXPECT_THAT(trace_.errors("zavtasks"),
                ElementsAre("Failed to open file " + scratch_.path("none") +
                            " using mode \"rb\", check permissions"));
}

TEST_F(WholeFile, EmptyFilesAreEmpty) {
    EXPECT_TRUE(readFile(written("f", "")) == "");
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(WholeFile, DirectoriesAreEmpty) {
    scratch_.makeDir("d");
    EXPECT_TRUE(readFile(path("d")) == "");
}

TEST_F(WholeFile, NulBytesAreLeftOut) {
    EXPECT_EQ(narrow(readFile(written("f", std::string("a\0b\0c", 5)))), "abc");
}

TEST_F(WholeFile, AReadErrorDropsEverything) {
    const String file = written("f", sampleText(3000));
    reportedStreamError = 5;
    const String text = readFile(file);
    reportedStreamError = 0;
    EXPECT_TRUE(text == "");
    EXPECT_THAT(trace_.errors("zavtasks"),
                ElementsAre("Error reading from file " + scratch_.path("f") + ", error is 5"));
}

TEST_F(WholeFile, AFailedCloseDoesNotMatterToAReader) {
    const String file = written("f", "text");
    closingFails = true;
    const String text = readFile(file);
    closingFails = false;
    EXPECT_TRUE(text == "text");
    EXPECT_THAT(trace_.errors("zavtasks"),
                ElementsAre("Failed to close stream for file " + scratch_.path("f")));
}

TEST_F(WholeFile, WritesOverWhatWasThere) {
    const String file = written("f", "a longer text than the new one");
    EXPECT_EQ(writeFile(file, "new\n"), 1);
    EXPECT_EQ(scratch_.read("f"), "new\n");
    EXPECT_FALSE(scratch_.exists("f.tmp"));
}

TEST_F(WholeFile, WritesOnAfterAWriteThatTookLittle) {
    const std::string text = sampleText(1050);
    writesAreShort = true;
    EXPECT_EQ(writeFile(path("f"), text.c_str()), 1);
    EXPECT_EQ(scratch_.read("f"), text);
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(WholeFile, AnEmptyTextMakesAnEmptyFile) {
    EXPECT_EQ(writeFile(path("new"), ""), 1);
    EXPECT_EQ(writeFile(written("old", "text"), ""), 1);
    EXPECT_TRUE(scratch_.exists("new"));
    EXPECT_EQ(scratch_.read("new"), "");
    EXPECT_EQ(scratch_.read("old"), "");
}

TEST_F(WholeFile, AWrittenTextEndsAtItsFirstZero) {
    for (const unsigned short last : Units{'b', 0xE4}) {
        const unsigned short units[] = {'a', last, 0, last};
        String text;
        text.assign(units, 4);
        EXPECT_EQ(writeFile(path("f"), text), 1);
        text.assign(units, 2);
        EXPECT_EQ(writeFile(path("g"), text), 1);
        EXPECT_EQ(scratch_.read("g"), scratch_.read("f"));
        EXPECT_GE(scratch_.read("f").size(), 2u);
    }
}

TEST_F(WholeFile, WrittenFilesAreNotExecutable) {
    EXPECT_EQ(writeFile(path("script.sh"), "#!/bin/sh\n"), 1);
    struct stat status {};
    ASSERT_EQ(::stat(scratch_.path("script.sh").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0111u, 0u);
}

TEST_F(WholeFile, FilesStayOffTheStandardDescriptors) {
    const int saved = ::fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 3);
    ::close(STDIN_FILENO);
    const int written = writeFile(path("f"), "text");
    const int writer = lastClosed;
    const String text = readFile(path("f"));
    const int reader = lastClosed;
    if (saved >= 0) {
        ::dup2(saved, STDIN_FILENO);
        ::close(saved);
    }
    EXPECT_EQ(written, 1);
    EXPECT_TRUE(text == "text");
    EXPECT_GT(writer, STDERR_FILENO);
    EXPECT_GT(reader, STDERR_FILENO);
}

TEST_F(WholeFile, NothingIsWrittenWhereNoFileCanBe) {
    scratch_.makeDir("d");
    EXPECT_EQ(writeFile(path("none/f"), "text"), 0);
    EXPECT_EQ(writeFile(path("d"), "text"), 0);
    EXPECT_THAT(trace_.errors("zavtasks"),
                ElementsAre("Failed to open file " + scratch_.path("none/f") +
                                " using mode \"rb\", check permissions",
                            "Failed to open file " + scratch_.path("d") +
                                " using mode \"rb\", check permissions"));
}

TEST_F(WholeFile, AWriteErrorIsReported) {
    const String file = path("f");
    reportedStreamError = 5;
    EXPECT_EQ(writeFile(file, "text"), 0);
    reportedStreamError = 0;
    EXPECT_THAT(trace_.errors("zavtasks"),
                ElementsAre("Error writing to file " + scratch_.path("f") +
                            ", error code: Input/output error"));
}

TEST_F(WholeFile, APipeOrADeviceIsAFileThatCannotBeOpened) {
    ASSERT_EQ(::mkfifo(scratch_.path("fifo").c_str(), 0600), 0);
    for (const std::string& special : {scratch_.path("fifo"), std::string("/dev/zero")}) {
        trace_.clear();
        EXPECT_EQ(writeFile(special.c_str(), "text"), 0) << special;
        EXPECT_EQ(narrow(readFile(special.c_str())), "") << special;
        const std::string why =
            "Failed to open file " + special + " using mode \"rb\", check permissions";
        EXPECT_THAT(trace_.errors("zavtasks"), ElementsAre(why, why));
    }
}

TEST_F(WholeFile, AFileThatMayNotGrowIsReported) {
    struct rlimit before {};
    ASSERT_EQ(::getrlimit(RLIMIT_FSIZE, &before), 0);
    auto* const handler = std::signal(SIGXFSZ, SIG_IGN);
    const struct rlimit small { 8192, before.rlim_max };
    ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &small), 0);
    const int result = writeFile(path("f"), sampleText(100000).c_str());
    ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &before), 0);
    std::signal(SIGXFSZ, handler);
    EXPECT_EQ(result, 0);
    EXPECT_EQ(std::filesystem::file_size(scratch_.path("f")), 8192u);
}

TEST_F(WholeFile, CharactersOfSeveralBytesAreKeptWhole) {
    ::setenv("LC_ALL", "C.UTF-8", 1);
    ASSERT_TRUE(String::initialize());
    // A block of 1024 bytes ends between the two bytes of an umlaut.
    const std::string text = sampleText(1023) + "\xC3\xA4\xE2\x82\xAC\xF0\x9F\x98\x80 end\n";
    const String read = readFile(written("f", text));
    EXPECT_EQ(read.length(), 1023u + 2u + 2u + 5u);
    EXPECT_EQ(writeFile(path("g"), read), 1);
    EXPECT_EQ(scratch_.read("g"), text);
    ::unsetenv("LC_ALL");
    String::initialize();
}

TEST_F(WholeFile, DeletesFiles) {
    EXPECT_EQ(deleteFile(written("f", "text")), 1);
    EXPECT_FALSE(scratch_.exists("f"));
    EXPECT_THAT(trace_.details("zavtasks"),
                ElementsAre("Successfully deleted file " + scratch_.path("f")));
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(WholeFile, WhatCannotBeDeletedIsReported) {
    scratch_.makeDir("d");
    EXPECT_EQ(deleteFile(path("none")), 0);
    EXPECT_EQ(deleteFile(path("d")), 0);
    EXPECT_TRUE(scratch_.exists("d"));
    EXPECT_THAT(
        trace_.errors("zavtasks"),
        ElementsAre("Failed to delete file " + scratch_.path("none") +
                        " error was: No such file or directory",
                    "Failed to delete file " + scratch_.path("d") + " error was: Is a directory"));
}

TEST_F(WholeFile, SplitsPaths) {
    String directory("before");
    EXPECT_EQ(getDirectoryFromPath("/a/b/file.txt", directory), 1);
    EXPECT_TRUE(directory == "/a/b");
    EXPECT_TRUE(getFilenameFromPath("/a/b/file.txt") == "file.txt");
    EXPECT_EQ(getDirectoryFromPath("a/b", directory), 1);
    EXPECT_TRUE(directory == "a");
    EXPECT_TRUE(getFilenameFromPath("a/b") == "b");
}

TEST_F(WholeFile, APathThatEndsInASeparatorHasNoFileName) {
    String directory;
    EXPECT_EQ(getDirectoryFromPath("/a/b/", directory), 1);
    EXPECT_TRUE(directory == "/a/b");
    EXPECT_TRUE(getFilenameFromPath("/a/b/") == "");
}

TEST_F(WholeFile, PathsWithoutADirectoryPartAreWholeFileNames) {
    for (const char* path : {"/file.txt", "file.txt", "/", ""}) {
        trace_.clear();
        String directory("before");
        EXPECT_EQ(getDirectoryFromPath(path, directory), 0);
        EXPECT_TRUE(directory == "before");
        EXPECT_TRUE(getFilenameFromPath(path) == path);
        EXPECT_THAT(trace_.errors("zavtasks"), ElementsAre("Directory [" + std::string(path) +
                                                           "] cannot be parsed, no dir separator"));
    }
}

std::string without(const char* text, char c) {
    String s(text);
    removeChar(s, c);
    return narrow(s);
}

TEST(RemoveChar, RemovesEveryOccurrence) {
    EXPECT_EQ(without("'a'b''c'", '\''), "abc");
}

TEST(RemoveChar, LeavesOtherTextsAlone) {
    EXPECT_EQ(without("abc", '\''), "abc");
    EXPECT_EQ(without("", '\''), "");
}

TEST(RemoveChar, MayLeaveNothing) {
    EXPECT_EQ(without("'", '\''), "");
    EXPECT_EQ(without("''''", '\''), "");
}

TEST(RemoveChar, TakesBytesAsUnsigned) {
    const unsigned short units[] = {'a', 0xE4, 'b', 0};
    String s(units);
    removeChar(s, '\xE4');
    EXPECT_TRUE(s == "ab");
}

}  // namespace
