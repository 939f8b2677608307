// What is left to a host that may open fewer and fewer descriptors: each operation either succeeds
// or fails as it is said, and none is left half open.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <unistd.h>

#include <cstring>
#include <filesystem>

#include "faults/scenario.h"
#include "rpc/zavrpc.h"
#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "tasks/whole_file.h"
#include "util/zavutil.h"

using namespace faults;
using ZAV::String;
using ZAV::Util;

namespace {

/// While it exists, only this many more descriptors can be opened.
class DescriptorsLeft {
public:
    explicit DescriptorsLeft(unsigned count) {
        ::getrlimit(RLIMIT_NOFILE, &before_);
        // The limit is on the number of the next one; there may be free numbers below it.
        std::vector<int> free;
        for (unsigned i = 0; i <= count; ++i)
            free.push_back(::fcntl(STDOUT_FILENO, F_DUPFD_CLOEXEC, 0));
        for (const int fd : free)
            ::close(fd);
        rlimit limit = before_;
        limit.rlim_cur = static_cast<rlim_t>(free.back());
        ::setrlimit(RLIMIT_NOFILE, &limit);
    }
    ~DescriptorsLeft() { ::setrlimit(RLIMIT_NOFILE, &before_); }
    DescriptorsLeft(const DescriptorsLeft&) = delete;
    DescriptorsLeft& operator=(const DescriptorsLeft&) = delete;

private:
    rlimit before_{};
};

constexpr unsigned kEnough = 12;

class DescriptorShortage : public testing::Test {
protected:
    void SetUp() override {
        if (!kMemoryIsOurs) GTEST_SKIP() << "the sanitizer needs descriptors itself";
        Util::_homeDir.clear();
        Util::_agentDepotDir.clear();
    }

    /// How `run` ends with so many descriptors left.
    template <typename Run>
    static End with(unsigned left, const Run& run) {
        const NothingLeft nothing;
        TraceCapture traces("ERROR");
        std::string result;
        {
            const DescriptorsLeft shortage(left);
            result = run();
        }
        return {result, traces.errors()};
    }

    ScratchDir scratch_;
    ScopedEnv homeVariable_{"TOVRINHOME", scratch_.makeDir("home")};
    ScopedEnv depotVariable_{"QVSDEPLOY_AGENTDEPOT", scratch_.makeDir("depot")};
};

TEST_F(DescriptorShortage, ACommandNeedsSixAndSaysWhichPipeItMisses) {
    const auto run = [] {
        int rc = -99;
        String out;
        String err;
        const bool ran = Util::runCommand("/bin/echo x", rc, out, err, "", false);
        return std::string(ran ? "true " : "false ") + narrow(out);
    };
    const char* const missing[] = {"stdout", "stdout", "stderr", "stderr", "stdin", "stdin"};
    unsigned left = 0;
    for (const char* const pipe : missing) {
        EXPECT_EQ(with(left++, run), (End{"false ",
                                          {std::string("failed to create ") + pipe + " pipe",
                                           "Failed to start process for cmd /bin/echo x"}}));
    }
    for (; left < kEnough; ++left)
        EXPECT_EQ(with(left, run), (End{"true x\n", {}})) << left;
}

TEST_F(DescriptorShortage, ATransferNeedsTwoAndItsConversionFour) {
    scratch_.makeDir("home/tmp");
    const std::string file = scratch_.path("depot/install.sh");
    const auto run = [&] {
        ZAV::DataChunk chunk;
        chunk.length = 3;
        std::memcpy(chunk.data, "a\r\n", 3);
        std::int32_t status = -1;
        BinaryDataTransfer(nullptr, 0, "install.sh", 0, 1, 0, &chunk, &status);
        return std::to_string(status);
    };
    EXPECT_EQ(run(), "0");
    const End unopened{"4",
                       {"Failed to open file " + file + " using mode \"wb\", check permissions"}};
    const End unconverted{
        "0", {"Could not open [" + scratch_.path("home") + "//tmp/.zavtemp] for writing."}};
    for (const unsigned left : {0U, 1U})
        EXPECT_EQ(with(left, run), unopened) << left;
    for (const unsigned left : {2U, 3U})
        EXPECT_EQ(with(left, run), unconverted) << left;
    EXPECT_EQ(scratch_.read("depot/install.sh"), "a\r\n");
    for (unsigned left = 4; left < kEnough; ++left)
        EXPECT_EQ(with(left, run), (End{"0", {}})) << left;
    EXPECT_EQ(scratch_.read("depot/install.sh"), "a\n");
}

TEST_F(DescriptorShortage, WholeFilesNeedOne) {
    const std::string file = scratch_.path("file");
    const End closed{"0",
                     {"Failed to open file " + file + " using mode \"rb\", check permissions"}};
    const auto write = [&] { return std::to_string(writeFile(file.c_str(), "text")); };
    EXPECT_EQ(with(0, write), closed);
    EXPECT_EQ(with(1, write), (End{"1", {}}));
    const auto read = [&] { return narrow(readFile(file.c_str())); };
    EXPECT_EQ(with(0, read), (End{"", closed.errors}));
    EXPECT_EQ(with(1, read), (End{"text", {}}));
}

}  // namespace
