// ctest-label: threaded
#include "ctl/client/transfer/arrival.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "ctl/client/canned_host.h"

namespace {

using ctl::PushedFile;
using ctl_test::CannedHost;
using ctl_test::Peer;

ctl::HostAddress addressOf(const CannedHost& host) {
    return {host.path(), "", std::chrono::seconds(20)};
}

PushedFile fileWithSum(const std::string& name, const std::string& sum) {
    PushedFile file;
    file.name = name;
    file.sha256 = sum;
    file.taken = 1;
    file.isSent = true;
    return file;
}

CannedHost::Part answering(int status, const std::string& body) {
    return [=](const CannedHost& self) {
        const Peer peer = self.accept();
        peer.request();
        peer.answer(status, body);
    };
}

TEST(VerifyArrival, FindsTheFilesThatChangedOnTheirWay) {
    const CannedHost host(answering(200, R"({"files": [{"sha256": "aa"}, {"sha256": "xx"},
                                                       {"error": "the depot holds no c"}]})"));
    std::vector<PushedFile> files = {fileWithSum("a", "aa"), fileWithSum("b", "bb"),
                                     fileWithSum("c", "cc")};
    EXPECT_EQ(ctl::verifyArrival(addressOf(host), files), "");
    EXPECT_EQ(files[0].problem, "");
    EXPECT_EQ(files[1].problem, "it is not in the depot as it was sent: SHA-256 xx in place of bb");
    EXPECT_EQ(files[1].guard, "depot-verify");
    EXPECT_EQ(files[2].problem, "it cannot be verified: the depot holds no c");
}

TEST(VerifyArrival, LeavesOutWhatWasNotTaken) {
    std::string request;
    CannedHost host([&request](const CannedHost& self) {
        const Peer peer = self.accept();
        request = peer.request();
        peer.answer(200, R"({"files": [{"sha256": "bb"}]})");
    });
    std::vector<PushedFile> files = {fileWithSum("a", "aa"), fileWithSum("b", "bb")};
    files[0].worst.status = 4;
    EXPECT_EQ(ctl::verifyArrival(addressOf(host), files), "");
    host.join();
    EXPECT_THAT(request, testing::StartsWith("GET /v1/depot/sum?path=b HTTP/1.1\r\n"));
}

TEST(VerifyArrival, SaysWhyItIsUnknown) {
    std::vector<PushedFile> files = {fileWithSum("a", "aa")};
    {
        const CannedHost host(answering(404, R"({"error": "there is nothing at /v1/depot/sum"})"));
        EXPECT_EQ(ctl::verifyArrival(addressOf(host), files), "the host cannot compute checksums");
    }
    EXPECT_THAT(ctl::verifyArrival({"/nobody", "", std::chrono::seconds(1)}, files),
                testing::HasSubstr("no host reached"));
    EXPECT_EQ(files[0].problem, "");
}

TEST(RemovePartialFiles, TouchesNoFileThatIsWholeOrNotOurs) {
    std::vector<PushedFile> files = {fileWithSum("whole", ""), fileWithSum("begun", ""),
                                     fileWithSum("refused", "")};
    files[1].isSent = false;
    files[2].taken = 0;
    files[2].worst.status = 6;
    std::string request;
    CannedHost host([&request](const CannedHost& self) {
        const Peer peer = self.accept();
        request = peer.request();
        peer.answer(200, "{}");
    });
    EXPECT_EQ(ctl::removePartialFiles(addressOf(host), files),
              std::vector<std::string>{"what had arrived of begun is removed"});
    host.join();
    EXPECT_THAT(request, testing::StartsWith("DELETE /v1/depot?path=begun HTTP/1.1\r\n"));
    EXPECT_EQ(ctl::namePartialFiles(files),
              std::vector<std::string>{"begun may be in the depot in part"});
}

TEST(RemovePartialFiles, SayThatTheFormerFileIsGone) {
    std::vector<PushedFile> files = {fileWithSum("begun", "")};
    files[0].isSent = false;
    files[0].replaces = true;
    {
        const CannedHost host(answering(200, "{}"));
        EXPECT_EQ(
            ctl::removePartialFiles(addressOf(host), files),
            std::vector<std::string>{"what had arrived of begun is removed; the file that was "
                                     "there before is gone"});
    }
    EXPECT_EQ(ctl::namePartialFiles(files),
              std::vector<std::string>{"begun may be in the depot in part; the file that was there "
                                       "before is gone"});
    const CannedHost host(answering(409, R"({"error": "busy"})"));
    EXPECT_THAT(ctl::removePartialFiles(addressOf(host), files).at(0),
                testing::EndsWith("busy; the file that was there before is gone"));
}

TEST(RemovePartialFiles, SayThatAFormerFileMayBeGoneWhenTheHostHasNotAnswered) {
    std::vector<PushedFile> files(3);
    for (PushedFile& file : files)
        file.name = "small";
    files[0].unanswered = 1;
    files[0].replaces = true;
    files[1].unanswered = 1;   // there was none
    files[2].replaces = true;  // nothing of it has been sent
    const std::vector<std::string> doubt = {"the small that was there before may be gone"};
    EXPECT_EQ(ctl::namePartialFiles(files), doubt);
    EXPECT_EQ(ctl::removePartialFiles({"/nobody", "", std::chrono::seconds(1)}, files), doubt);
}

TEST(RemovePartialFiles, NamesWhatCannotBeRemoved) {
    std::vector<PushedFile> files = {fileWithSum("begun", "")};
    files[0].isSent = false;
    const CannedHost host(answering(409, R"({"error": "busy"})"));
    const std::vector<std::string> said = ctl::removePartialFiles(addressOf(host), files);
    ASSERT_EQ(said.size(), 1U);
    EXPECT_THAT(said[0], testing::StartsWith("begun may be in the depot in part, and cannot be "
                                             "removed: "));
}

TEST(RemovePartialFiles, AsksAHostThatHangsUpOnce) {
    const CannedHost host([](const CannedHost& self) { self.accept(); });
    std::vector<PushedFile> files = {fileWithSum("a", ""), fileWithSum("b", "")};
    for (PushedFile& file : files)
        file.worst.status = 5;
    const std::vector<std::string> said = ctl::removePartialFiles(addressOf(host), files);
    ASSERT_EQ(said.size(), 2U);
    const std::string begin = " may be in the depot in part, and cannot be removed: ";
    EXPECT_THAT(said[0], testing::StartsWith("a" + begin));
    EXPECT_EQ(said[1], "b" + said[0].substr(1));
}

}  // namespace
