// Reading, removing and copying whole files.
#include <dlfcn.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>

#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "util/zavutil.h"

namespace {

/// The errors that the next calls of each kind report without doing their work; 0 for none.
struct Faults {
    int interruptedReads = 0;
    int interruptedWrites = 0;
    int failingClose = 0;  ///< the number of the close that fails, counting from 1
    bool shortWrites = false;
};
Faults faults;

template <typename Function>
Function real(const char* name) {
    return reinterpret_cast<Function>(::dlsym(RTLD_NEXT, name));
}

}  // namespace

extern "C" ssize_t read(int fd, void* buffer, std::size_t size) {
    static const auto next = real<ssize_t (*)(int, void*, std::size_t)>("read");
    if (faults.interruptedReads > 0) {
        --faults.interruptedReads;
        errno = EINTR;
        return -1;
    }
    return next(fd, buffer, size);
}

extern "C" ssize_t write(int fd, const void* data, std::size_t size) {
    static const auto next = real<ssize_t (*)(int, const void*, std::size_t)>("write");
    if (faults.interruptedWrites > 0) {
        --faults.interruptedWrites;
        errno = EINTR;
        return -1;
    }
    return next(fd, data, faults.shortWrites && size > 100 ? 100 : size);
}

extern "C" int close(int fd) {
    static const auto next = real<int (*)(int)>("close");
    const int rc = next(fd);
    if (faults.failingClose > 0 && --faults.failingClose == 0) {
        errno = EIO;
        return -1;
    }
    return rc;
}

#if defined(__SANITIZE_ADDRESS__)
extern "C" const char* __asan_default_options() {
    return "allocator_may_return_null=1";
}
#endif

using namespace ZAV;
using ::testing::ElementsAre;

namespace {

struct Freed {
    void operator()(char* text) const { std::free(text); }
};
using Buffer = std::unique_ptr<char, Freed>;

class Files : public ::testing::Test {
protected:
    Files() : descriptorsBefore(openDescriptors()) {}
    ~Files() override {
        faults = Faults();
        EXPECT_EQ(openDescriptors(), descriptorsBefore);
    }

    static long openDescriptors() {
        return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
    }

    /// Reads into `text`; returns the result.
    int read(const std::string& path) {
        char* buffer = reinterpret_cast<char*>(1);
        const int rc = Util::readFile(path.c_str(), &buffer);
        text.reset(buffer);
        return rc;
    }

    String wide(const std::string& path) const { return String(scratch.path(path).c_str()); }

    ScratchDir scratch;
    TraceCapture traces;
    long descriptorsBefore;
    Buffer text;
};

TEST_F(Files, ReadGivesTheBytesAndATerminatingZero) {
    EXPECT_EQ(read(scratch.write("f", "one\ntwo\r\n")), 0);
    EXPECT_STREQ(text.get(), "one\ntwo\r\n");
}

TEST_F(Files, ReadKeepsZerosAndEveryLength) {
    for (std::size_t size = 1; size < 70000; size = size * 3 + 1) {
        std::string content(size, 'x');
        content[size / 2] = '\0';
        ASSERT_EQ(read(scratch.write("f", content)), 0);
        ASSERT_EQ(std::string(text.get(), size + 1), content + '\0');
    }
}

TEST_F(Files, ReadOfAnEmptyFileGivesNoBuffer) {
    EXPECT_EQ(read(scratch.write("f", "")), 0);
    EXPECT_EQ(text, nullptr);
}

TEST_F(Files, ReadWithoutAPathIsInvalid) {
    char* buffer = reinterpret_cast<char*>(1);
    errno = 0;
    EXPECT_EQ(Util::readFile(nullptr, &buffer), 22);
    EXPECT_EQ(errno, EINVAL);
    EXPECT_EQ(buffer, nullptr);
}

TEST_F(Files, ReadOfAMissingFileGivesTheReason) {
    EXPECT_EQ(read(scratch.path("none")), ENOENT);
    EXPECT_EQ(text, nullptr);
    EXPECT_EQ(read(scratch.write("f", "x") + "/below"), ENOTDIR);
    EXPECT_EQ(text, nullptr);
    EXPECT_THAT(traces.errors(), ElementsAre());
}

TEST_F(Files, ReadOfADirectoryFails) {
    EXPECT_EQ(read(scratch.path()), EISDIR);
    EXPECT_EQ(text, nullptr);
}

TEST_F(Files, ReadOfSpecialFilesEndsWithoutABuffer) {
    for (const char* device : {"/dev/null", "/dev/zero"}) {
        EXPECT_EQ(read(device), ESPIPE) << device;
        EXPECT_EQ(text, nullptr);
    }
    EXPECT_EQ(read("/proc/self/status"), EINVAL);
    EXPECT_EQ(text, nullptr);
}

TEST_F(Files, ReadOfAPipeFailsWithOrWithoutAWriter) {
    const std::string fifo = scratch.path("fifo");
    ASSERT_EQ(::mkfifo(fifo.c_str(), 0600), 0);
    EXPECT_EQ(read(fifo), ESPIPE);
    EXPECT_EQ(text, nullptr);
    const int writer = ::open(fifo.c_str(), O_RDWR | O_CLOEXEC);
    EXPECT_EQ(read(fifo), ESPIPE);
    EXPECT_EQ(text, nullptr);
    ::close(writer);
}

TEST_F(Files, ReadOfAFileThatHoldsLessThanItClaimsEndsWithTheContent) {
    const std::string path = "/sys/devices/system/cpu/online";
    if (!std::filesystem::exists(path)) GTEST_SKIP() << "no such file here";
    std::string content;
    std::getline(std::ifstream(path), content);
    EXPECT_EQ(read(path), 0);
    EXPECT_EQ(text.get(), content + "\n");
}

TEST_F(Files, ReadThatIsInterruptedGoesOn) {
    const std::string path = scratch.write("f", "content");
    faults.interruptedReads = 3;
    EXPECT_EQ(read(path), 0);
    EXPECT_STREQ(text.get(), "content");
    EXPECT_EQ(faults.interruptedReads, 0);
}

TEST_F(Files, ReadOfAFileBeyondMemoryFails) {
    const std::string path = scratch.write("huge", "");
    constexpr std::uintmax_t kSize = 4ull << 40;
    std::error_code failure;
    std::filesystem::resize_file(path, kSize, failure);
    if (failure) GTEST_SKIP() << "no file of that size here: " << failure.message();
    EXPECT_EQ(read(path), ENOMEM);
    EXPECT_EQ(text, nullptr);
    EXPECT_THAT(traces.errors("zavutil"), ElementsAre("Unable to read file: " + path));
}

TEST_F(Files, DeleteRemovesTheFile) {
    scratch.write("f", "x");
    EXPECT_TRUE(Util::deleteFile(wide("f")));
    EXPECT_FALSE(scratch.exists("f"));
    EXPECT_THAT(traces.errors(), ElementsAre());
}

TEST_F(Files, DeleteSaysWhyItFailed) {
    EXPECT_FALSE(Util::deleteFile(wide("none")));
    EXPECT_THAT(traces.errors("zavutil"), ElementsAre("Error deleting [" + scratch.path("none") +
                                                      "]: No such file or directory"));
}

TEST_F(Files, CopyGoesIntoTheDirectoryUnderItsOwnName) {
    const std::string source = scratch.write("a/b/f.txt", "content");
    scratch.makeDir("to");
    EXPECT_EQ(Util::copyFile(wide("a/b/f.txt"), wide("to")), 0);
    EXPECT_EQ(scratch.read("to/f.txt"), "content");
    const std::string copy = scratch.path("to") + "/f.txt";
    EXPECT_THAT(
        traces.details("zavutil"),
        ElementsAre("Copying file [" + source + "] to directory [" + scratch.path("to") + "]",
                    "Source file [" + source + "] destination file [" + copy + "]",
                    "Exit with return code (0)", "Exit with return code (0)"));
}

TEST_F(Files, CopyWithoutADirectoryInTheSourceIsRefused) {
    EXPECT_EQ(Util::copyFile("f.txt", wide("")), 5);
    EXPECT_EQ(Util::copyFile("/f.txt", wide("")), 5);
    EXPECT_EQ(Util::copyFile("", wide("")), 5);
    EXPECT_TRUE(std::filesystem::is_empty(scratch.path()));
}

TEST_F(Files, CopyTakesANewName) {
    scratch.write("f", "content");
    scratch.makeDir("to");
    EXPECT_EQ(Util::copyFile(wide("f"), wide("to"), "g"), 0);
    EXPECT_EQ(scratch.read("to/g"), "content");
    EXPECT_EQ(traces.details("zavutil").front(),
              "Copying file [" + scratch.path("f") + "] to directory [" + scratch.path("to") + "]");
}

TEST_F(Files, CopyReplacesWhatWasThere) {
    scratch.write("f", "new");
    scratch.write("to/f", "what was there before");
    EXPECT_EQ(Util::copyFile(wide("f"), wide("to")), 0);
    EXPECT_EQ(scratch.read("to/f"), "new");
}

TEST_F(Files, CopyIsExactAtEveryBlockLength) {
    for (const unsigned size : {0u, 1u, 1023u, 1024u, 1025u, 4095u, 4096u, 4097u, 5120u, 100000u}) {
        std::string content;
        for (std::size_t i = 0; i < size; ++i)
            content += static_cast<char>(i * 7 % 256);
        scratch.write("f", content);
        ASSERT_EQ(Util::_copyFile(wide("f"), wide("g")), 0);
        ASSERT_EQ(scratch.read("g"), content) << size;
    }
}

TEST_F(Files, CopyOfAFileOntoItselfLeavesItEmpty) {
    scratch.write("f", "content");
    EXPECT_EQ(Util::copyFile(wide("f"), wide("")), 0);
    EXPECT_EQ(scratch.read("f"), "");
}

TEST_F(Files, CopyOfAMissingSourceFails) {
    EXPECT_EQ(Util::_copyFile(wide("none"), wide("g")), ENOENT);
    EXPECT_FALSE(scratch.exists("g"));
    EXPECT_THAT(traces.errors("zavutil"),
                ElementsAre("Failed to open source file " + scratch.path("none") +
                            " using mode \"rb\", check permissions, error code: No such file or "
                            "directory"));
    EXPECT_EQ(traces.details("zavutil").back(), "Exit with return code (2)");
}

TEST_F(Files, CopyToAMissingDirectoryFails) {
    scratch.write("f", "x");
    EXPECT_EQ(Util::copyFile(wide("f"), wide("none")), ENOENT);
    EXPECT_THAT(traces.errors("zavutil"),
                ElementsAre("Failed to open destination file " + scratch.path("none") +
                            "/f using mode \"wb\", check permissions, error code: No such file or "
                            "directory"));
}

TEST_F(Files, CopyOntoADirectoryFails) {
    scratch.write("f", "x");
    EXPECT_EQ(Util::_copyFile(wide("f"), wide("")), EISDIR);
}

TEST_F(Files, CopyOfADirectoryFailsWhileReading) {
    scratch.makeDir("d");
    EXPECT_EQ(Util::_copyFile(wide("d"), wide("g")), EISDIR);
    EXPECT_THAT(traces.errors("zavutil"),
                ElementsAre("Error reading from file " + scratch.path("d") +
                            ", error code: Is a directory"));
    EXPECT_EQ(scratch.read("g"), "");
}

TEST_F(Files, CopyFromOrToAPipeOrADeviceFailsAtOnce) {
    scratch.write("f", "x");
    ASSERT_EQ(::mkfifo(scratch.path("fifo").c_str(), 0600), 0);
    EXPECT_EQ(Util::_copyFile(wide("fifo"), wide("g")), ESPIPE);
    EXPECT_EQ(Util::_copyFile(wide("f"), wide("fifo")), ENXIO);
    EXPECT_EQ(Util::_copyFile("/dev/zero", wide("g")), ESPIPE);
    EXPECT_EQ(Util::_copyFile(wide("f"), "/dev/null"), ESPIPE);
    EXPECT_THAT(traces.errors("zavutil"), testing::SizeIs(4));
    EXPECT_EQ(traces.errors("zavutil")[0],
              "Failed to open source file " + scratch.path("fifo") +
                  " using mode \"rb\", check permissions, error code: Illegal seek");
    EXPECT_FALSE(scratch.exists("g"));
}

TEST_F(Files, CopyReportsAFailedClose) {
    scratch.write("f", "x");
    const String from = wide("f");
    const String to = wide("g");
    const std::string paths[] = {scratch.path("f"), scratch.path("g")};
    for (const int which : {1, 2}) {
        traces.clear();
        faults.failingClose = which;
        EXPECT_EQ(Util::_copyFile(from, to), EIO);
        EXPECT_THAT(traces.errors("zavutil"),
                    ElementsAre("Failed to close stream for file " + paths[which - 1] +
                                ", error code: Input/output error"));
    }
}

TEST_F(Files, CopyReportsTheFirstFailureOfSeveral) {
    scratch.makeDir("d");
    const String from = wide("d");
    const String to = wide("g");
    faults.failingClose = 1;
    EXPECT_EQ(Util::_copyFile(from, to), EISDIR);
    EXPECT_EQ(traces.errors("zavutil").size(), 2u);
}

TEST_F(Files, CopyThatCannotBeginReportsThatAndNotTheCloseAfterIt) {
    scratch.write("f", "x");
    const String from = wide("f");
    const String to = wide("none/g");
    faults.failingClose = 1;
    EXPECT_EQ(Util::_copyFile(from, to), ENOENT);
    EXPECT_EQ(traces.errors("zavutil").size(), 2u);
}

// Without a trace capture, because its own writes would fail first.
TEST(InterruptedFiles, CopyThatIsInterruptedOrTakesLittleAtATimeIsExact) {
    const ScratchDir scratch;
    const std::string content(20000, 'x');
    const String from = scratch.write("f", content).c_str();
    const String to = scratch.path("g").c_str();
    faults.interruptedReads = 2;
    faults.interruptedWrites = 2;
    faults.shortWrites = true;
    const int rc = Util::_copyFile(from, to);
    const int left = faults.interruptedReads + faults.interruptedWrites;
    faults = Faults();
    EXPECT_EQ(rc, 0);
    EXPECT_EQ(left, 0);
    EXPECT_EQ(scratch.read("g"), content);
}

}  // namespace
