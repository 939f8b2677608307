// The line-end conversion when one of its steps fails.
#include <dlfcn.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "rpc/zavrpc.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "util/zavutil.h"

// These definitions replace the C library's, so that each step can be made to fail for paths that
// end in a given text.
namespace {

struct Failure {
    std::string step;
    std::string end;
};
Failure failing;

bool fails(const char* step, const std::string& path) {
    const std::string& end = failing.end;
    if (failing.step != step || path.size() < end.size()) return false;
    return path.compare(path.size() - end.size(), end.size(), end) == 0;
}

template <typename Function>
Function next(const char* name) {
    return reinterpret_cast<Function>(::dlsym(RTLD_NEXT, name));
}

std::string pathOf(int fd) {
    char path[4096] = "";
    const std::string descriptor = "/proc/self/fd/" + std::to_string(fd);
    const ssize_t length = ::readlink(descriptor.c_str(), path, sizeof path - 1);
    return std::string(path, length > 0 ? static_cast<std::size_t>(length) : 0);
}

int failWith(int error) {
    errno = error;
    return -1;
}

}  // namespace

extern "C" {

int fchmod(int fd, mode_t mode) noexcept {
    if (fails("fchmod", pathOf(fd))) return failWith(EPERM);
    return next<int (*)(int, mode_t)>("fchmod")(fd, mode);
}

int unlink(const char* path) noexcept {
    if (fails("unlink", path)) return failWith(EACCES);
    return next<int (*)(const char*)>("unlink")(path);
}

int link(const char* from, const char* to) noexcept {
    if (fails("link", to)) return failWith(EXDEV);
    return next<int (*)(const char*, const char*)>("link")(from, to);
}

int close(int fd) {
    const bool toFail = fails("close", pathOf(fd));
    const int closed = next<int (*)(int)>("close")(fd);
    return toFail ? failWith(EIO) : closed;
}

}  // extern "C"

namespace {

using Texts = std::vector<std::string>;

class Dos2Unix : public testing::Test {
protected:
    Dos2Unix() {
        ::setenv("TOVRINHOME", scratch_.makeDir("home").c_str(), 1);
        scratch_.makeDir("home/tmp");
        ::setenv("QVSDEPLOY_AGENTDEPOT", scratch_.makeDir("depot").c_str(), 1);
        forget();
        file_ = scratch_.write("depot/install.sh", "a\r\nb\x1a");
    }
    ~Dos2Unix() override {
        failing = {};
        ::unsetenv("TOVRINHOME");
        ::unsetenv("QVSDEPLOY_AGENTDEPOT");
        forget();
    }

    static void forget() {
        ZAV::Util::_homeDir.clear();
        ZAV::Util::_agentDepotDir.clear();
    }

    /// The error lines of a conversion in which one step fails.
    Texts errorsOf(const Failure& failure) {
        failing = failure;
        TraceCapture trace;
        EXPECT_EQ(convertDOS2Unix(file_.c_str()), -1);
        failing = {};
        return trace.errors("zavrpc");
    }

    bool exists() const { return scratch_.exists("depot/install.sh"); }
    std::string original() const { return scratch_.read("depot/install.sh"); }
    std::string converted() const { return scratch_.read("home/tmp/.zavtemp"); }
    std::string temporary() const { return scratch_.path("home") + "//tmp/.zavtemp"; }
    static std::string why(int error) {
        return "ERRNO: " + std::to_string(error) + " - " + std::strerror(error);
    }

    ScratchDir scratch_;
    std::string file_;
};

TEST_F(Dos2Unix, NamesItsTemporaryFileAndLeavesNone) {
    TraceCapture trace;
    EXPECT_EQ(convertDOS2Unix(file_.c_str()), 0);
    EXPECT_EQ(trace.count('D', "tempfile name: [" + temporary() + "]"), 1);
    EXPECT_EQ(trace.errors("zavrpc"), Texts{});
    EXPECT_EQ(original(), "a\nb");
    EXPECT_FALSE(scratch_.exists("home/tmp/.zavtemp"));
}

TEST_F(Dos2Unix, EitherFileMayFailToClose) {
    EXPECT_EQ(errorsOf({"close", "/install.sh"}), (Texts{"Could not close [" + file_ + "]."}));
    EXPECT_EQ(errorsOf({"close", "/.zavtemp"}), (Texts{"Could not close [" + temporary() + "]."}));
    EXPECT_EQ(original(), "a\r\nb\x1a");
}

TEST_F(Dos2Unix, AnInputMayFailToCloseWhenThereIsNoTemporaryFile) {
    ASSERT_EQ(::rmdir((scratch_.path("home") + "/tmp").c_str()), 0);
    EXPECT_EQ(errorsOf({"close", "/install.sh"}),
              (Texts{"Could not open [" + temporary() + "] for writing.",
                     "Could not close [" + file_ + "]."}));
}

TEST_F(Dos2Unix, PermissionsThatCannotBeSetLeaveTheOriginal) {
    EXPECT_EQ(errorsOf({"fchmod", "/.zavtemp"}),
              (Texts{"Failed to set permissions on file [" + temporary() + "] to [504]"}));
    EXPECT_EQ(original(), "a\r\nb\x1a");
}

TEST_F(Dos2Unix, AnOriginalThatCannotBeRemovedStays) {
    EXPECT_EQ(errorsOf({"unlink", "/install.sh"}),
              (Texts{"Failed to unlink file [" + file_ + "]. " + why(EACCES)}));
    EXPECT_EQ(original(), "a\r\nb\x1a");
}

TEST_F(Dos2Unix, AResultThatCannotBeLinkedStaysInTheTemporaryFile) {
    EXPECT_EQ(errorsOf({"link", "/install.sh"}), (Texts{"Failed to link file [" + temporary() +
                                                        "] to [" + file_ + "]. " + why(EXDEV)}));
    EXPECT_FALSE(exists());
    EXPECT_EQ(converted(), "a\nb");
}

TEST_F(Dos2Unix, ATemporaryFileThatCannotBeRemovedIsAFailureAtTheEnd) {
    EXPECT_EQ(errorsOf({"unlink", "/.zavtemp"}),
              (Texts{"Failed to unlink temp file [" + temporary() + "]. " + why(EACCES)}));
    EXPECT_EQ(original(), "a\nb");
}

TEST_F(Dos2Unix, WithoutAHomeTheTemporaryFileIsInTheWorkingDirectory) {
    ::unsetenv("TOVRINHOME");
    forget();
    failing = {"unlink", "/install.sh"};
    TraceCapture trace;
    EXPECT_EQ(convertDOS2Unix(file_.c_str()), -1);
    EXPECT_EQ(trace.count('D', "tempfile name: [.zavtemp]"), 1);
    EXPECT_EQ(::unlink(".zavtemp"), 0);
}

TEST_F(Dos2Unix, ATransferWhosePermissionsCannotBeSetCarriesOn) {
    failing = {"fchmod", "/depot/install.sh"};
    const ZAV::DataChunk chunk{3, {'x', '\r', '\n'}};
    std::int32_t status = -1;
    TraceCapture trace;
    BinaryDataTransfer(nullptr, 0, "install.sh", 0, 1, 0, &chunk, &status);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(trace.errors("zavrpc"),
              (Texts{"Failed to set permissions on file [" + file_ + "] to [504]"}));
    EXPECT_EQ(trace.count('D', "Its a file we're interested in: " + file_), 1);
    EXPECT_EQ(original(), "x\n");
}

TEST_F(Dos2Unix, ALinkInTheTemporaryFilesPlaceIsNotFollowed) {
    const std::string outside = scratch_.write("outside", "untouched");
    ASSERT_EQ(::symlink(outside.c_str(), scratch_.path("home/tmp/.zavtemp").c_str()), 0);
    TraceCapture trace;
    EXPECT_EQ(convertDOS2Unix(file_.c_str()), -1);
    EXPECT_EQ(trace.errors("zavrpc"), (Texts{"Could not open [" + temporary() + "] for writing."}));
    EXPECT_EQ(scratch_.read("outside"), "untouched");
    EXPECT_EQ(original(), "a\r\nb\x1a");
}

TEST_F(Dos2Unix, PipesInPlaceOfEitherFileAreNotWaitedFor) {
    const std::string pipe = scratch_.path("depot/pipe");
    ASSERT_EQ(::mkfifo(pipe.c_str(), 0600), 0);
    TraceCapture trace;
    EXPECT_EQ(convertDOS2Unix(pipe.c_str()), -1);
    EXPECT_EQ(trace.errors("zavrpc"), (Texts{"Could not open [" + pipe + "] for reading."}));
    trace.clear();
    ASSERT_EQ(::mkfifo(scratch_.path("home/tmp/.zavtemp").c_str(), 0600), 0);
    EXPECT_EQ(convertDOS2Unix(file_.c_str()), -1);
    EXPECT_EQ(trace.errors("zavrpc"), (Texts{"Could not open [" + temporary() + "] for writing."}));
    EXPECT_EQ(original(), "a\r\nb\x1a");
}

}  // namespace
