// ctest-label: threaded
#include "rpc/zavrpc.h"

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstring>
#include <filesystem>
#include <thread>

#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "util/zavutil.h"

namespace {

using ZAV::DataChunk;
using ZAV::Util;

std::vector<DataChunk> chunksOf(const std::vector<std::string>& texts) {
    std::vector<DataChunk> chunks(texts.size());
    for (std::size_t i = 0; i < texts.size(); ++i) {
        chunks[i].length = static_cast<std::uint32_t>(texts[i].size());
        std::memcpy(chunks[i].data, texts[i].data(), texts[i].size());
    }
    return chunks;
}

/// A home with its own depot, which the library does not know yet.
class BinaryDataTransferTest : public testing::Test {
protected:
    BinaryDataTransferTest() {
        ::setenv("TOVRINHOME", scratch_.makeDir("home").c_str(), 1);
        scratch_.makeDir("home/tmp");
        ::setenv("QVSDEPLOY_AGENTDEPOT", scratch_.makeDir("depot").c_str(), 1);
        Util::_homeDir.clear();
        Util::_agentDepotDir.clear();
    }
    ~BinaryDataTransferTest() override {
        ::unsetenv("TOVRINHOME");
        ::unsetenv("QVSDEPLOY_AGENTDEPOT");
        Util::_homeDir.clear();
        Util::_agentDepotDir.clear();
    }

    static std::int32_t send(const std::string& name, const std::vector<std::string>& texts,
                             bool first = true) {
        const std::vector<DataChunk> chunks = chunksOf(texts);
        std::int32_t status = -1;
        BinaryDataTransfer(nullptr, 7, name.c_str(), 8, first ? 1 : 0,
                           static_cast<std::int32_t>(texts.size()) - 1, chunks.data(), &status);
        return status;
    }
    std::string depot(const std::string& relative) const {
        return scratch_.read("depot/" + relative);
    }
    void link(const std::string& target, const std::string& at) const {
        ASSERT_EQ(::symlink(target.c_str(), scratch_.path(at).c_str()), 0) << at;
    }
    std::vector<std::string> filesIn(const std::string& directory) const {
        std::vector<std::string> names;
        for (const auto& entry : std::filesystem::directory_iterator(scratch_.path(directory)))
            names.push_back(entry.path().filename());
        return names;
    }
    std::string depotPath() const { return scratch_.path("depot") + "/"; }
    unsigned modeOf(const std::string& relative) const {
        struct stat found {};
        return ::stat(scratch_.path("depot/" + relative).c_str(), &found) == 0
                   ? found.st_mode & 07777U
                   : 0;
    }

    ScratchDir scratch_;
};

TEST_F(BinaryDataTransferTest, WritesTheChunksOfOneBatch) {
    TraceCapture trace;
    EXPECT_EQ(send("file", {"abc", "", "def"}), 0);
    EXPECT_EQ(depot("file"), "abcdef");
    EXPECT_EQ(modeOf("file"), 0770U);
    EXPECT_THAT(
        trace.details("zavrpc"),
        testing::ElementsAre("Destination path name is: " + depotPath() + "file",
                             "Failed to unlink file [" + depotPath() +
                                 "file]. File must not exist or we dont have perms to "
                                 "unlink it",
                             "Opened file " + depotPath() + "file for appending using mode wb"));
    EXPECT_TRUE(trace.errors("zavrpc").empty());
}

TEST_F(BinaryDataTransferTest, TheFirstBatchReplacesAndLaterOnesAppend) {
    send("file", {"old content that is longer"});
    EXPECT_EQ(send("file", {"one"}), 0);
    TraceCapture trace;
    EXPECT_EQ(send("file", {"two"}, false), 0);
    EXPECT_EQ(depot("file"), "onetwo");
    EXPECT_EQ(trace.count('D', "Opened file " + depotPath() + "file for appending using mode a+b"),
              1);
}

TEST_F(BinaryDataTransferTest, AnyFirstBatchOtherThanOneAppends) {
    send("file", {"one"});
    const std::vector<DataChunk> chunks = chunksOf({"two"});
    std::int32_t status = -1;
    BinaryDataTransfer(nullptr, 0, "file", 0, 2, 0, chunks.data(), &status);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(depot("file"), "onetwo");
}

TEST_F(BinaryDataTransferTest, AppendingToAFileThatDoesNotExistCreatesIt) {
    EXPECT_EQ(send("new", {"x"}, false), 0);
    EXPECT_EQ(depot("new"), "x");
}

TEST_F(BinaryDataTransferTest, BackslashesSeparateAndTheDirectoryIsMadeOnTheWay) {
    TraceCapture trace;
    EXPECT_EQ(send("\\sub\\install.sh", {"#!/bin/sh\r\necho\x1a\r\n"}), 0);
    EXPECT_EQ(depot("sub/install.sh"), "#!/bin/sh\necho\n");
    EXPECT_EQ(modeOf("sub/install.sh"), 0770U);
    EXPECT_EQ(trace.count('D', "Its a file we're interested in: " + depotPath() + "sub/install.sh"),
              1);
    EXPECT_EQ(trace.count('D', "tempfile name: [" + scratch_.path("home") + "//tmp/.zavtemp]"), 1);
    EXPECT_FALSE(scratch_.exists("home/tmp/.zavtemp"));
}

TEST_F(BinaryDataTransferTest, OnlyOneLeadingSeparatorGoes) {
    TraceCapture trace;
    EXPECT_EQ(send("//a", {"x"}), 0);
    EXPECT_EQ(trace.count('D', "Destination path name is: " + depotPath() + "/a"), 1);
    EXPECT_EQ(depot("a"), "x");
}

TEST_F(BinaryDataTransferTest, ANameOf1024CharactersIsAcceptedAndOneMoreIsNot) {
    // Components of 200 characters, short enough for the file system.
    std::string name;
    while (depotPath().size() + name.size() + 201 < 1000)
        name += std::string(200, 'd') + "/";
    name += std::string(1024 - depotPath().size() - name.size(), 'f');
    EXPECT_EQ(send(name, {"x"}), 0);
    EXPECT_EQ(depot(name), "x");
    TraceCapture trace;
    EXPECT_EQ(send(name + "f", {"x"}), 3);
    EXPECT_EQ(trace.count('E', "Destination path name too long, max is 1023 characters"), 1);
}

TEST_F(BinaryDataTransferTest, TheDirectoryIsMadeBeforeTheLengthIsChecked) {
    EXPECT_EQ(send("sub/" + std::string(1100, 'f'), {"x"}), 3);
    EXPECT_TRUE(scratch_.exists("depot/sub"));
}

TEST_F(BinaryDataTransferTest, ADepotThatCannotBeHadIsStatusOne) {
    ::unsetenv("QVSDEPLOY_AGENTDEPOT");
    ::unsetenv("TOVRINHOME");
    Util::_agentDepotDir.clear();
    TraceCapture trace;
    EXPECT_EQ(send("file", {"x"}), 1);
    EXPECT_EQ(trace.errors("zavrpc"), std::vector<std::string>{"No useable Agent Depot dir"});
}

TEST_F(BinaryDataTransferTest, AFileThatCannotBeOpenedIsStatusFour) {
    scratch_.makeDir("depot/taken");
    TraceCapture trace;
    EXPECT_EQ(send("taken", {"x"}), 4);
    EXPECT_EQ(trace.errors("zavrpc"),
              std::vector<std::string>{"Failed to open file " + depotPath() +
                                       "taken using mode \"wb\", check permissions"});
    EXPECT_EQ(send("taken", {"x"}, false), 4);
    EXPECT_EQ(trace.count('E', "Failed to open file " + depotPath() +
                                   "taken using mode \"a+b\", check permissions"),
              1);
}

TEST_F(BinaryDataTransferTest, APipeInTheDepotIsStatusFourOrReplaced) {
    ASSERT_EQ(::mkfifo(scratch_.path("depot/pipe").c_str(), 0600), 0);
    TraceCapture trace;
    EXPECT_EQ(send("pipe", {"x"}, false), 4);
    EXPECT_EQ(trace.errors("zavrpc"),
              std::vector<std::string>{"Failed to open file " + depotPath() +
                                       "pipe using mode \"a+b\", check permissions"});
    EXPECT_EQ(send("pipe", {"x"}), 0);
    EXPECT_EQ(depot("pipe"), "x");
}

TEST_F(BinaryDataTransferTest, AChunkThatClaimsTooMuchIsStatusFive) {
    std::vector<DataChunk> chunks = chunksOf({"good", "bad", "never"});
    chunks[1].length = 4097;
    TraceCapture trace;
    std::int32_t status = -1;
    BinaryDataTransfer(nullptr, 0, "file", 0, 1, 2, chunks.data(), &status);
    EXPECT_EQ(status, 5);
    EXPECT_EQ(trace.errors("zavrpc"),
              std::vector<std::string>{"Error writing chunk 1, error number was 1"});
    EXPECT_EQ(depot("file"), "good");
}

TEST_F(BinaryDataTransferTest, ADirectoryThatCannotBeMadeIsStatusSix) {
    scratch_.write("depot/file", "x");
    TraceCapture trace;
    EXPECT_EQ(send("file/below/x", {"x"}), 6);
    EXPECT_EQ(
        trace.count('E', "Could not create destination directory " + depotPath() + "file/below"),
        1);
}

TEST_F(BinaryDataTransferTest, ANameNeverLeadsOutOfTheDepot) {
    scratch_.makeDir("outside/deep");
    ASSERT_EQ(::symlink(scratch_.path("outside/deep").c_str(), scratch_.path("depot/link").c_str()),
              0);
    for (const char* name : {"../outside/x", "..\\outside\\x", "a/../../outside/x", "/../outside/x",
                             "a/b/../../../outside/x", "..", "./../x", "link/../x"}) {
        TraceCapture trace;
        EXPECT_EQ(send(name, {"x"}), 6) << name;
        EXPECT_EQ(trace.errors("zavrpc").size(), 1U) << name;
        EXPECT_EQ(trace.errors("zavrpc")[0].rfind("Could not create destination directory ", 0),
                  0U);
    }
    EXPECT_FALSE(scratch_.exists("outside/x"));
    EXPECT_FALSE(scratch_.exists("depot/a")) << "refused before any directory is made";
}

TEST_F(BinaryDataTransferTest, LinksThatStayInTheDepotAreFollowedAndDotsInsideAreHarmless) {
    scratch_.makeDir("depot/a/deep");
    scratch_.write("depot/b/old", "old", 0600);
    link("a/deep", "depot/link");
    link("../../b", "depot/a/deep/aside");
    link("../b/old", "depot/a/file");
    EXPECT_EQ(send("link/x", {"linked"}), 0);
    EXPECT_EQ(depot("a/deep/x"), "linked");
    EXPECT_EQ(send("link/aside/made/y", {"twice"}), 0);
    EXPECT_EQ(depot("b/made/y"), "twice");
    EXPECT_EQ(send("a/file", {" and new"}, false), 0);
    EXPECT_EQ(depot("b/old"), "old and new");
    EXPECT_EQ(modeOf("b/old"), 0770U);
    EXPECT_EQ(send("a/../c", {"inside"}), 0);
    EXPECT_EQ(depot("c"), "inside");
    EXPECT_EQ(send("..c/...d", {"dots"}), 0);
    EXPECT_EQ(depot("..c/...d"), "dots");
    EXPECT_EQ(send("a//deep/./z", {"slashes"}), 0);
    EXPECT_EQ(depot("a/deep/z"), "slashes");
    EXPECT_EQ(send("new//deeper/./z", {"made"}), 0);
    EXPECT_EQ(depot("new/deeper/z"), "made");
}

TEST_F(BinaryDataTransferTest, LinksThatLeadOutOfTheDepotAreStatusSix) {
    scratch_.write("outside/file", "untouched", 0600);
    link(scratch_.path("outside"), "depot/absolute");
    link("../outside", "depot/relative");
    link(scratch_.path("depot"), "depot/home");  // absolute, even though it stays inside
    link("absolute", "depot/indirect");
    for (const char* directory : {"absolute", "relative", "home", "indirect"}) {
        for (const char* name : {"/file", "/new", "/sub/new", "/install.sh"}) {
            for (const bool first : {true, false}) {
                TraceCapture trace;
                EXPECT_EQ(send(std::string(directory) + name, {"x"}, first), 6)
                    << directory << name;
                EXPECT_EQ(trace.errors("zavrpc").size(), 1U);
                EXPECT_EQ(
                    trace.errors("zavrpc")[0].rfind(
                        "Could not create destination directory " + depotPath() + directory, 0),
                    0U);
            }
        }
    }
    EXPECT_EQ(filesIn("outside"), std::vector<std::string>{"file"});
    EXPECT_EQ(scratch_.read("outside/file"), "untouched");
    EXPECT_FALSE(scratch_.exists("depot/new"));
}

TEST_F(BinaryDataTransferTest, AFileThatIsALinkOutOfTheDepotIsReplacedButNeverAppendedTo) {
    const std::string outside = scratch_.write("outside/x.mdl", "a\r\n", 0600);
    for (const std::string& target : {outside, std::string("../outside/x.mdl")}) {
        link(target, "depot/x.mdl");
        TraceCapture trace;
        EXPECT_EQ(send("x.mdl", {"more"}, false), 6);
        EXPECT_EQ(trace.errors("zavrpc"),
                  std::vector<std::string>{"Could not create destination directory " +
                                           scratch_.path("depot")});
        EXPECT_EQ(send("x.mdl", {"new\r\n"}), 0);
        EXPECT_EQ(depot("x.mdl"), "new\n");
        EXPECT_EQ(scratch_.read("outside/x.mdl"), "a\r\n");
        ASSERT_EQ(::unlink(scratch_.path("depot/x.mdl").c_str()), 0);
    }
}

TEST_F(BinaryDataTransferTest, ALinkToNowhereInsideMakesItsTarget) {
    link("real", "depot/link");
    EXPECT_EQ(send("link", {"x"}, false), 0);
    EXPECT_EQ(depot("real"), "x");
}

TEST_F(BinaryDataTransferTest, ADepotThatIsGoneIsMadeAgain) {
    EXPECT_EQ(send("file", {"x"}), 0);
    std::filesystem::remove_all(scratch_.path("depot"));
    EXPECT_EQ(send("a/b/file", {"y"}), 0);
    EXPECT_EQ(depot("a/b/file"), "y");
    std::filesystem::remove_all(scratch_.path("depot"));
    EXPECT_EQ(send("file", {"z"}), 0);
    EXPECT_EQ(depot("file"), "z");
}

TEST_F(BinaryDataTransferTest, ADepotBehindALinkOfTheAdministratorsIsFine) {
    scratch_.makeDir("elsewhere");
    link(scratch_.path("elsewhere"), "place");
    ::setenv("QVSDEPLOY_AGENTDEPOT", scratch_.path("place").c_str(), 1);
    Util::_agentDepotDir.clear();
    EXPECT_EQ(send("a/file", {"x"}), 0);
    EXPECT_EQ(scratch_.read("elsewhere/a/file"), "x");
}

TEST_F(BinaryDataTransferTest, AModelFileLosesEveryCarriageReturnBatchAfterBatch) {
    EXPECT_EQ(send("model.mdl", {"a\r\nb\rc\r"}), 0);
    EXPECT_EQ(depot("model.mdl"), "a\nbc");
    EXPECT_EQ(send("model.mdl", {"\nd\r\n"}, false), 0);
    EXPECT_EQ(depot("model.mdl"), "a\nbc\nd\n");
}

TEST_F(BinaryDataTransferTest, OnlyInterestingNamesAreConverted) {
    for (const char* name : {"install.sh", "DeployLnk.sh", "x.mdl.bak", "install.sh.d/other"}) {
        EXPECT_EQ(send(name, {"a\r\n"}), 0);
        EXPECT_EQ(depot(name), "a\n") << name;
    }
    for (const char* name : {"INSTALL.SH", "deploylnk.sh", "x.txt"}) {
        EXPECT_EQ(send(name, {"a\r\n"}), 0);
        EXPECT_EQ(depot(name), "a\r\n") << name;
    }
}

TEST_F(BinaryDataTransferTest, AConversionThatFailsDoesNotChangeTheStatus) {
    ASSERT_EQ(::rmdir(scratch_.path("home/tmp").c_str()), 0);
    TraceCapture trace;
    EXPECT_EQ(send("install.sh", {"a\r\n"}), 0);
    EXPECT_EQ(depot("install.sh"), "a\r\n");
    EXPECT_EQ(trace.errors("zavrpc"),
              std::vector<std::string>{"Could not open [" + scratch_.path("home") +
                                       "//tmp/.zavtemp] for writing."});
}

TEST_F(BinaryDataTransferTest, ConversionReportsWhatItCannotDo) {
    TraceCapture trace;
    const std::string missing = depotPath() + "missing";
    EXPECT_EQ(convertDOS2Unix(missing.c_str()), -1);
    EXPECT_EQ(trace.errors("zavrpc"),
              std::vector<std::string>{"Could not open [" + missing + "] for reading."});
    const std::string file = scratch_.write("depot/plain", "x\r\ny\x1az", 0600);
    EXPECT_EQ(convertDOS2Unix(file.c_str()), 0);
    EXPECT_EQ(depot("plain"), "x\nyz");
    EXPECT_EQ(modeOf("plain"), 0770U);
}

TEST_F(BinaryDataTransferTest, ADirectoryIsNeverConverted) {
    scratch_.makeDir("depot/dir");
    EXPECT_EQ(convertDOS2Unix((depotPath() + "dir").c_str()), -1);
    EXPECT_TRUE(scratch_.exists("depot/dir"));
}

TEST_F(BinaryDataTransferTest, ManyTransfersAtOnceArriveWhole) {
    std::vector<std::thread> threads;
    for (int t = 0; t < 8; ++t) {
        threads.emplace_back([t] {
            const std::string name =
                "d" + std::to_string(t % 2) + "/install.sh." + std::to_string(t);
            for (int batch = 0; batch < 10; ++batch) {
                ASSERT_EQ(
                    send(name, {std::string(4096, static_cast<char>('a' + t)), "\r\n"}, batch == 0),
                    0);
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    for (int t = 0; t < 8; ++t) {
        std::string expected;
        for (int batch = 0; batch < 10; ++batch) {
            expected += std::string(4096, static_cast<char>('a' + t)) + "\n";
        }
        EXPECT_EQ(depot("d" + std::to_string(t % 2) + "/install.sh." + std::to_string(t)),
                  expected);
    }
}

}  // namespace
