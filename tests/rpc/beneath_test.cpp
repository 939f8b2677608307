// ctest-label: threaded
// Names that are resolved beneath a directory: by the kernel, and by a walk where the kernel does
// not do it.
#include "rpc/beneath.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstring>
#include <filesystem>
#include <string>
#include <thread>

#include "rpc/zavrpc.h"
#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "util/zavutil.h"

namespace {

/// What openat2 fails with; 0 = it is the kernel's.
std::atomic<int> openat2Error{0};
std::atomic<int> kernelOpened{0};

}  // namespace

// Stands in for the C library's, so that a kernel without openat2 can be played.
extern "C" long syscall(long number, ...) noexcept {
    std::va_list list;
    va_start(list, number);
    long arguments[6];
    for (long& argument : arguments)
        argument = va_arg(list, long);
    va_end(list);
    if (number == SYS_openat2 && openat2Error != 0) {
        errno = openat2Error;
        return -1;
    }
    static auto* const real = reinterpret_cast<long (*)(long, ...)>(::dlsym(RTLD_NEXT, "syscall"));
    const long result = real(number, arguments[0], arguments[1], arguments[2], arguments[3],
                             arguments[4], arguments[5]);
    if (number == SYS_openat2 && result >= 0) ++kernelOpened;
    return result;
}

namespace {

using ZAV::FileDescriptor;
using ZAV::openBeneath;

/// The parameter is what openat2 fails with.
class Beneath : public testing::TestWithParam<int> {
protected:
    Beneath() {
        scratch_.write("outside/file", "untouched");
        scratch_.write("top/a/b/file", "content");
        openat2Error = GetParam();
    }
    ~Beneath() override { openat2Error = 0; }

    void link(const std::string& target, const std::string& at) const {
        ASSERT_EQ(::symlink(target.c_str(), scratch_.path(at).c_str()), 0) << at;
    }
    /// "open", or why not.
    std::string opened(const std::string& name, int flags = O_RDONLY, mode_t mode = 0) const {
        const FileDescriptor top(
            ::open(scratch_.path("top").c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
        const FileDescriptor file = openBeneath(top.get(), name.c_str(), flags, mode);
        return file.isOpen() ? "open" : ::strerrorname_np(errno);
    }

    ScratchDir scratch_;
};

TEST_P(Beneath, OpensWhatLiesBeneath) {
    link("a/b", "top/link");
    link("../a/b/file", "top/a/across");
    link("link/file", "top/chain");
    for (const char* name :
         {"a/b/file", "a//b/./file", "./a/b/file", "a/../a/b/../b/file", "link/file",
          "link/../b/file", "a/across", "chain", "a", "a/", ".", "a/.", "a/b/..", "link/"}) {
        EXPECT_EQ(opened(name), "open") << name;
    }
}

TEST_P(Beneath, NothingLeadsOut) {
    link(scratch_.path("outside"), "top/absolute");
    link(scratch_.path("top/a"), "top/home");
    link("../outside", "top/relative");
    link("a/../../outside/file", "top/winding");
    link("relative", "top/indirect");
    link("/", "top/root");
    for (const char* name : {"..", "../top/a", "a/../..", "a/../../outside/file", "/", "/etc",
                             "absolute", "absolute/file", "home/b/file", "relative",
                             "relative/file", "winding", "indirect/file", "root/etc"}) {
        EXPECT_EQ(opened(name), "EXDEV") << name;
        EXPECT_EQ(opened(name, O_PATH), "EXDEV") << name;
        EXPECT_EQ(opened(name, O_WRONLY | O_CREAT | O_TRUNC, 0600), "EXDEV") << name;
    }
    EXPECT_EQ(scratch_.read("outside/file"), "untouched");
}

TEST_P(Beneath, SaysWhyNot) {
    link("loop", "top/loop");
    link("none", "top/dangling");
    EXPECT_EQ(opened(""), "ENOENT");
    EXPECT_EQ(opened("none"), "ENOENT");
    EXPECT_EQ(opened("none/file"), "ENOENT");
    EXPECT_EQ(opened("dangling"), "ENOENT");
    EXPECT_EQ(opened("a/b/file/below"), "ENOTDIR");
    EXPECT_EQ(opened("a/b/file/"), "ENOTDIR");
    EXPECT_EQ(opened("a/b/file/.."), "ENOTDIR");
    EXPECT_EQ(opened("loop"), "ELOOP");
    EXPECT_EQ(opened("loop/file"), "ELOOP");
    EXPECT_EQ(opened("a", O_WRONLY), "EISDIR");
    EXPECT_EQ(opened("a/", O_WRONLY | O_CREAT, 0600), "EISDIR");
    EXPECT_EQ(opened("a/b/file", O_WRONLY | O_CREAT | O_EXCL, 0600), "EEXIST");
    EXPECT_EQ(opened(std::string(300, 'x')), "ENAMETOOLONG");
}

TEST_P(Beneath, CreatesWithTheModeGivenAndThroughALinkInside) {
    link("a/new", "top/link");
    const mode_t before = ::umask(022);
    EXPECT_EQ(opened("link", O_WRONLY | O_CREAT, 0666), "open");
    ::umask(before);
    struct stat found {};
    ASSERT_EQ(::stat(scratch_.path("top/a/new").c_str(), &found), 0);
    EXPECT_EQ(found.st_mode & 07777U, 0644U);
}

TEST_P(Beneath, WaitsForNoPipeAndOpensNoDevice) {
    ASSERT_EQ(::mkfifo(scratch_.path("top/pipe").c_str(), 0600), 0);
    EXPECT_EQ(opened("pipe"), "ESPIPE");
    EXPECT_EQ(opened("pipe", O_RDWR | O_APPEND), "ESPIPE");
    EXPECT_EQ(opened("pipe", O_WRONLY), "ENXIO");
    EXPECT_EQ(opened("pipe", O_PATH), "open");
}

TEST_P(Beneath, LeavesNoDescriptorAndNeedsFewHoweverDeepTheName) {
    std::string name;
    for (int depth = 0; depth < 200; ++depth)
        name += "d/";
    std::filesystem::create_directories(scratch_.path("top/" + name));
    const FileDescriptor before(::open("/dev/null", O_RDONLY | O_CLOEXEC));
    EXPECT_EQ(opened(name + "../d/../../d/d"), "open");
    const FileDescriptor after(::open("/dev/null", O_RDONLY | O_CLOEXEC));
    EXPECT_EQ(after.get(), before.get() + 1);
}

TEST_P(Beneath, TheKernelIsAskedFirst) {
    kernelOpened = 0;
    EXPECT_EQ(opened("a/b/file"), "open");
    if (GetParam() != 0) {
        EXPECT_EQ(kernelOpened, 0);
        return;
    }
    if (kernelOpened == 0) GTEST_SKIP() << "this kernel does not resolve beneath";
    EXPECT_EQ(kernelOpened, 1);
}

/// Exchanges a directory of the depot and a link that leads out, again and again.
class Exchanger {
public:
    Exchanger(std::string one, std::string other)
        : thread_([this, one, other] {
              for (int i = 0; i < 10000; ++i)
                  failed_ +=
                      ::renameat2(AT_FDCWD, one.c_str(), AT_FDCWD, other.c_str(), RENAME_EXCHANGE);
              done_ = true;
          }) {}
    bool done() const { return done_; }
    int failed() const { return failed_; }
    void join() { thread_.join(); }

private:
    std::atomic<int> failed_{0};
    std::atomic<bool> done_{false};
    std::thread thread_;
};

TEST_P(Beneath, RenamesBetweenCheckAndUseDoNotLeadATransferOut) {
    const ScopedEnv home("TOVRINHOME", scratch_.makeDir("home"));
    scratch_.makeDir("home/tmp");
    const ScopedEnv depot("QVSDEPLOY_AGENTDEPOT", scratch_.path("top"));
    ZAV::Util::_homeDir.clear();
    ZAV::Util::_agentDepotDir.clear();
    scratch_.write("outside/x.mdl", "untouched", 0600);
    link(scratch_.path("outside"), "top/swapped");
    const ZAV::DataChunk chunk{3, {'x', '\r', '\n'}};

    Exchanger exchanger(scratch_.path("top/a"), scratch_.path("top/swapped"));
    int round = 0;
    while (!exchanger.done()) {
        ++round;
        for (const std::string& name : {std::string("a/file"), std::string("a/x.mdl"),
                                        "a/made" + std::to_string(round % 7) + "/x.mdl"}) {
            std::int32_t status = -1;
            BinaryDataTransfer(nullptr, 0, name.c_str(), 0, round % 2, 0, &chunk, &status);
        }
    }
    exchanger.join();
    ZAV::Util::_homeDir.clear();
    ZAV::Util::_agentDepotDir.clear();
    EXPECT_EQ(exchanger.failed(), 0);
    EXPECT_EQ(scratch_.read("outside/file"), "untouched");
    EXPECT_EQ(scratch_.read("outside/x.mdl"), "untouched");
    const std::filesystem::directory_iterator outside(scratch_.path("outside"));
    EXPECT_EQ(std::distance(begin(outside), end(outside)), 2);
}

std::string nameOf(const testing::TestParamInfo<int>& error) {
    return error.param == 0 ? "kernel" : std::string("walk_") + ::strerrorname_np(error.param);
}

INSTANTIATE_TEST_SUITE_P(Resolved, Beneath, testing::Values(0, ENOSYS, EPERM, EAGAIN), nameOf);

}  // namespace
