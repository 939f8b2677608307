// ctest-label: threaded
// Creating directory trees.
#include <dlfcn.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <string>
#include <thread>
#include <vector>

#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "util/zavutil.h"

namespace {

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool kMallocIsOurs = false;
#else
constexpr bool kMallocIsOurs = true;
#endif

/// The next allocation of exactly this many bytes fails.
std::atomic<std::size_t> failingAllocation{0};
/// The next mkdir finds that another process has just created the directory.
std::atomic<bool> somebodyIsFaster{false};

}  // namespace

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)
extern "C" void* __libc_malloc(std::size_t size);

extern "C" void* malloc(std::size_t size) {
    std::size_t expected = size;
    if (size != 0 && failingAllocation.compare_exchange_strong(expected, 0)) {
        errno = ENOMEM;
        return nullptr;
    }
    return __libc_malloc(size);
}
#endif

extern "C" int mkdir(const char* path, mode_t mode) noexcept {
    using Mkdir = int (*)(const char*, mode_t);
    static const auto real = reinterpret_cast<Mkdir>(::dlsym(RTLD_NEXT, "mkdir"));
    if (somebodyIsFaster.exchange(false)) real(path, mode);
    return real(path, mode);
}

using namespace ZAV;
using ::testing::ElementsAre;

namespace {

class CreateDir : public ::testing::Test {
protected:
    mode_t former = ::umask(022);
    ~CreateDir() override { ::umask(former); }

    ScratchDir scratch;
    TraceCapture traces;
};

TEST_F(CreateDir, MakesTheWholeTree) {
    const std::string path = scratch.path("a/b/c");
    EXPECT_EQ(Util::createDir(path.c_str()), 0);
    EXPECT_TRUE(scratch.exists("a/b/c"));
    EXPECT_THAT(traces.details("zavutil"), ElementsAre("Making directory " + scratch.path("a"),
                                                       "Making directory " + scratch.path("a/b"),
                                                       "Making final directory " + path));
    EXPECT_THAT(traces.errors(), ElementsAre());
}

TEST_F(CreateDir, GivesAllDirectoriesTheSameMode) {
    ASSERT_EQ(Util::createDir(scratch.path("a/b").c_str()), 0);
    for (const char* made : {"a", "a/b"}) {
        struct stat info;
        ASSERT_EQ(::stat(scratch.path(made).c_str(), &info), 0);
        EXPECT_EQ(info.st_mode & 07777u, 0750u) << made;
    }
}

TEST_F(CreateDir, ExistingDirectoryIsReported) {
    const std::string path = scratch.path("a/b/c");
    ASSERT_EQ(Util::createDir(path.c_str()), 0);
    EXPECT_EQ(Util::createDir(path.c_str()), 17);
    EXPECT_THAT(traces.errors("zavutil"),
                ElementsAre("Failed to make directory " + path + ", return code status"));
}

TEST_F(CreateDir, NothingButSlashesIsNothingToCreate) {
    EXPECT_EQ(Util::createDir("/"), 1);
    EXPECT_EQ(Util::createDir("///"), 1);
    EXPECT_EQ(Util::createDir(""), 1);
    EXPECT_THAT(traces.errors("zavutil"),
                ElementsAre("Could not create directory /, nothing to create",
                            "Could not create directory ///, nothing to create",
                            "Could not create directory , nothing to create"));
}

TEST_F(CreateDir, SlashesMayBeDoubledAndTrailing) {
    const std::string path = scratch.path("a//b/");
    EXPECT_EQ(Util::createDir(path.c_str()), 0);
    EXPECT_TRUE(scratch.exists("a/b"));
    EXPECT_THAT(traces.details("zavutil"), ElementsAre("Making directory " + scratch.path("a"),
                                                       "Making final directory " + path));
}

TEST_F(CreateDir, FileInTheWayStopsIt) {
    const std::string file = scratch.write("file", "");
    EXPECT_EQ(Util::createDir((file + "/b/c").c_str()), ENOTDIR);
    EXPECT_THAT(traces.errors("zavutil"),
                ElementsAre("Failed to make directory " + file + "/b, return code status"));
    EXPECT_EQ(traces.count('D', "Making final directory " + file + "/b/c"), 0);
}

TEST_F(CreateDir, DanglingLinkInTheWayStopsIt) {
    ASSERT_EQ(::symlink("nowhere", scratch.path("link").c_str()), 0);
    EXPECT_EQ(Util::createDir(scratch.path("link/b").c_str()), EEXIST);
}

TEST_F(CreateDir, DirectoryThatAppearsMeanwhileIsTakenAsItIs) {
    somebodyIsFaster = true;
    EXPECT_EQ(Util::createDir(scratch.path("a/b").c_str()), 0);
    EXPECT_TRUE(scratch.exists("a/b"));
    EXPECT_THAT(traces.errors(), ElementsAre());
}

TEST_F(CreateDir, ManyThreadsMakeTheirTreesBelowOneNewDirectory) {
    std::atomic<int> made{0};
    std::vector<std::thread> makers;
    for (int i = 0; i < 8; ++i) {
        makers.emplace_back([&, i] {
            const std::string path = scratch.path("x/y/z/" + std::to_string(i));
            if (Util::createDir(path.c_str()) == 0) ++made;
        });
    }
    for (std::thread& maker : makers)
        maker.join();
    EXPECT_EQ(made, 8);
}

TEST_F(CreateDir, ShortageOfMemoryIsReported) {
    if (!kMallocIsOurs) GTEST_SKIP() << "the sanitizer owns malloc";
    const std::string above = scratch.path(std::string(200, 'd'));
    const std::string path = above + "/e";
    failingAllocation = above.size() + 1;
    EXPECT_EQ(Util::createDir(path.c_str()), 2);
    failingAllocation = 0;
    EXPECT_THAT(traces.errors("zavutil"),
                ElementsAre("Malloc of " + std::to_string(above.size() + 1) + " bytes failed"));
    EXPECT_FALSE(scratch.exists(std::string(200, 'd')));
}

}  // namespace
