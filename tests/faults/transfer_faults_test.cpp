// The transfer of a file, with and without the conversion of its line ends, whose calls of the
// system fail one after the other.
#include <gmock/gmock.h>
#include <sys/resource.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <filesystem>

#include "embedded/ras1_control.h"
#include "faults/scenario.h"
#include "rpc/zavrpc.h"
#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "util/zavutil.h"

using namespace faults;
using ZAV::DataChunk;
using ZAV::Util;

namespace {

std::string why(int error) {
    return "ERRNO: " + std::to_string(error) + " - " + std::strerror(error);
}

class TransferFaults : public testing::Test {
protected:
    TransferFaults() { forget(); }
    ~TransferFaults() override { forget(); }

    static void forget() {
        Util::_homeDir.clear();
        Util::_agentDepotDir.clear();
    }

    std::string send(const std::string& name) const {
        DataChunk chunks[2];
        for (DataChunk& chunk : chunks) {
            chunk.length = 4;
            std::memcpy(chunk.data, "ab\r\n", 4);
        }
        std::int32_t status = -1;
        BinaryDataTransfer(nullptr, 0, name.c_str(), 0, 1, 1, chunks, &status);
        return "status " + std::to_string(status) + " [" + scratch_.read("depot/" + name) + "]";
    }
    /// `present`: the file is there from a former transfer.
    Scenario transferOf(const std::string& name, const std::string& content, bool present = true) {
        const auto prepare = [=] {
            std::filesystem::remove_all(scratch_.path("depot"));
            std::filesystem::remove(scratch_.path("home/tmp/.zavtemp"));
            scratch_.makeDir("depot");
            if (present) scratch_.write("depot/" + name, "old");
        };
        return Scenario(prepare, [=] { return send(name); }, {"status 0 [" + content + "]", {}});
    }
    std::string inDepot(const std::string& name) const { return depot_ + "/" + name; }

    ScratchDir scratch_;
    std::string home_ = scratch_.makeDir("home");
    std::string depot_ = scratch_.makeDir("depot");
    std::string temporary_ = scratch_.makeDir("home/tmp") + "/.zavtemp";
    ScopedEnv homeVariable_{"TOVRINHOME", home_};
    ScopedEnv depotVariable_{"QVSDEPLOY_AGENTDEPOT", depot_};
};

TEST_F(TransferFaults, OpeningIsStatusFour) {
    Scenario plain = transferOf("file", "ab\r\nab\r\n");
    const End refused{
        "status 4 []",
        {"Failed to open file " + inDepot("file") + " using mode \"wb\", check permissions"}};
    // The first one finds the directory of a former file, which is then not removed.
    for (const int error : {EMFILE, ENOSPC, EACCES, EROFS})
        plain.expectEach(Call::kOpenat2, error, {plain.unharmed(), refused});
    plain.expectEach(Call::kOpen, EMFILE, {plain.unharmed()});
    plain.expectEach(Call::kFstat, EIO, {refused});
    const Fault noDepot(Call::kOpen, 1, EMFILE, Fault::Lasts::kOnwards);
    EXPECT_EQ(send("new"), "status 4 []");
}

TEST_F(TransferFaults, WritingIsStatusFiveAndNamesTheChunk) {
    Scenario plain = transferOf("file", "ab\r\nab\r\n");
    for (const int error : {ENOSPC, EDQUOT, EIO}) {
        plain.expectEach(Call::kWritev, error,
                         {{"status 5 []", {"Error writing chunk 0, error number was 1"}}});
    }
}

TEST_F(TransferFaults, AChunkThatFitsInPartIsStatusFive) {
    Scenario plain = transferOf("file", "ab\r\nab\r\n");
    plain.prepare();
    rlimit before{};
    ASSERT_EQ(::getrlimit(RLIMIT_FSIZE, &before), 0);
    auto* const handler = std::signal(SIGXFSZ, SIG_IGN);
    const rlimit small{6, before.rlim_max};
    std::int32_t status = -1;
    {
        const NothingLeft nothing;
        const std::string name = "file";
        DataChunk chunks[2];
        for (DataChunk& chunk : chunks) {
            chunk.length = 4;
            std::memcpy(chunk.data, "abcd", 4);
        }
        ras1::configure("", "/dev/null");  // the trace must not be cut as well
        ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &small), 0);
        BinaryDataTransfer(nullptr, 0, name.c_str(), 0, 1, 1, chunks, &status);
        ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &before), 0);
        ras1::configureFromEnvironment();
    }
    std::signal(SIGXFSZ, handler);
    EXPECT_EQ(status, 5);
    EXPECT_EQ(scratch_.read("depot/file"), "abcdab");
}

TEST_F(TransferFaults, MakingTheDirectoryIsStatusSix) {
    Scenario nested = transferOf("a/b/file", "ab\r\nab\r\n", false);
    const auto failed = [&](const std::string& directory) {
        return End{"status 6 []",
                   {"Failed to make directory " + directory + ", return code status",
                    "Could not create destination directory " + inDepot("a/b")}};
    };
    for (const int error : {ENOSPC, EACCES})
        nested.expectEach(Call::kMkdirat, error, {failed(inDepot("a")), failed(inDepot("a/b"))});
}

TEST_F(TransferFaults, MemoryForTheDirectoryIsStatusSix) {
    if (!kMemoryIsOurs) GTEST_SKIP() << "the sanitizer owns malloc";
    Scenario nested = transferOf("a/file", "ab\r\nab\r\n", false);
    TraceCapture traces("ERROR");
    const End end = nested.endWith(Call::kMalloc, 1, ENOMEM);
    ASSERT_EQ(end.errors.size(), 2u);
    EXPECT_THAT(end.errors[0], testing::MatchesRegex("Malloc of [0-9]+ bytes failed"));
    EXPECT_EQ(end.errors[1], "Could not create destination directory " + inDepot("a"));
    EXPECT_EQ(end.result, "status 6 []");
}

TEST_F(TransferFaults, OtherStepsDoNotMatter) {
    Scenario plain = transferOf("file", "ab\r\nab\r\n");
    plain.expectEach(Call::kUnlinkat, EACCES, {plain.unharmed()});
    plain.expectAll(Call::kClose, EIO, {plain.unharmed()});
    plain.expectEach(Call::kFchmod, EPERM,
                     {{plain.unharmed().result,
                       {"Failed to set permissions on file [" + inDepot("file") + "] to [504]"}}});
}

TEST_F(TransferFaults, AConversionThatFailsIsTracedOnly) {
    Scenario script = transferOf("install.sh", "ab\nab\n");
    const std::string file = inDepot("install.sh");
    const std::string temporary = home_ + "//tmp/.zavtemp";
    const std::string unconverted = "status 0 [ab\r\nab\r\n]";

    const End unread{unconverted, {"Could not open [" + file + "] for reading."}};
    const End unwritten{unconverted, {"Could not open [" + temporary + "] for writing."}};
    const auto unremoved = [&](int error) {
        return End{unconverted, {"Failed to unlink file [" + file + "]. " + why(error)}};
    };
    const auto unlinked = [&](int error) {
        return End{"status 0 []",
                   {"Failed to link file [" + temporary + "] to [" + file + "]. " + why(error)}};
    };
    const End unopened{"status 4 []",
                       {"Failed to open file " + file + " using mode \"wb\", check permissions"}};

    script.expectEach(Call::kOpenat2, EMFILE,
                      {script.unharmed(), unopened, unread, unremoved(EMFILE)});
    script.expectEach(Call::kOpen, EMFILE, {script.unharmed(), unwritten});
    script.expectEach(Call::kFstat, EIO, {unopened, unread, unwritten});
    script.expectEach(Call::kFcntl, EMFILE, {unwritten});
    script.expectEach(Call::kWrite, ENOSPC,
                      {{unconverted, {"Could not close [" + temporary + "]."}}});
    script.expectEach(Call::kRead, EIO, {{unconverted, {}}, {unconverted, {}}});
    script.expectAll(Call::kClose, EIO,
                     {script.unharmed(),
                      {unconverted, {"Could not close [" + file + "]."}},
                      {unconverted, {"Could not close [" + temporary + "]."}}});
    script.expectEach(
        Call::kFchmod, EPERM,
        {{script.unharmed().result, {"Failed to set permissions on file [" + file + "] to [504]"}},
         {unconverted, {"Failed to set permissions on file [" + temporary + "] to [504]"}}});
    script.expectEach(Call::kUnlinkat, EACCES, {script.unharmed(), unremoved(EACCES)});
    script.expectEach(Call::kUnlink, EACCES,
                      {{script.unharmed().result,
                        {"Failed to unlink temp file [" + temporary + "]. " + why(EACCES)}}});
    script.expectEach(Call::kLinkat, EXDEV, {unlinked(EXDEV)});
}

TEST_F(TransferFaults, NoConversionLeavesATemporaryFileForTheNext) {
    Scenario script = transferOf("install.sh", "ab\nab\n");
    script.endWith(Call::kWrite, 1, ENOSPC);
    EXPECT_TRUE(scratch_.exists("home/tmp/.zavtemp"));
    EXPECT_EQ(send("install.sh"), script.unharmed().result);
    EXPECT_FALSE(scratch_.exists("home/tmp/.zavtemp"));
}

TEST_F(TransferFaults, AFullDiskBelowTheHomeLeavesTheFileUnconverted) {
    Scenario script = transferOf("install.sh", "ab\nab\n");
    EXPECT_EQ(script.endWith(Call::kWrite, 1, ENOSPC),
              (End{"status 0 [ab\r\nab\r\n]", {"Could not close [" + home_ + "//tmp/.zavtemp]."}}));
    EXPECT_EQ(scratch_.read("home/tmp/.zavtemp"), "");
}

TEST_F(TransferFaults, AKernelThatDoesNotResolveBeneathChangesNothing) {
    for (const int error : {ENOSYS, EPERM}) {
        Scenario script = transferOf("a/b/install.sh", "ab\nab\n", false);
        EXPECT_EQ(script.endWith(Call::kOpenat2, 1, error, Fault::Lasts::kOnwards),
                  script.unharmed());
        EXPECT_TRUE(script.happened());
    }
}

}  // namespace
