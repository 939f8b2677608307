// The vendor's example, built against an installed prefix: an agent with a platform of its own that
// has the plug-in built in.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>
#include <sstream>
#include <string>
#include <vector>

#include "support/host/program.h"
#include "support/host/script_home.h"
#include "support/host/starter_home.h"
#include "support/scratch_dir.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::StartsWith;

constexpr const char* kAgent = ZAV_EXAMPLE_DIR "/vendor-agent";
constexpr const char* kConformance = ZAV_EXAMPLE_DIR "/vendor-conformance";

/// Stands in for the log daemon: keeps the datagrams that have been sent to its socket.
class LogSocket {
public:
    LogSocket() : socket_(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0)) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        std::strncpy(address.sun_path, path().c_str(), sizeof address.sun_path - 1);
        EXPECT_EQ(::bind(socket_, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    }
    ~LogSocket() { ::close(socket_); }
    LogSocket(const LogSocket&) = delete;
    LogSocket& operator=(const LogSocket&) = delete;

    std::string path() const { return scratch_.path("log"); }
    std::vector<std::string> lines() const {
        std::vector<std::string> all;
        char text[2048];
        for (ssize_t count = ::recv(socket_, text, sizeof text, 0); count >= 0;
             count = ::recv(socket_, text, sizeof text, 0))
            all.emplace_back(text, static_cast<std::size_t>(count));
        return all;
    }

private:
    const ScratchDir scratch_;
    const int socket_;
};

class VendorAgent : public testing::Test {
protected:
    ProgramResult start(const std::string& home, const std::string& product) {
        return runProgram({kAgent, home, product}, "", {{"VENDOR_LOG", log.path()}});
    }
    LogSocket log;
};

TEST_F(VendorAgent, StartsARealAgentAndPrintsItsOutcome) {
    const StarterHome home("ux");
    const ProgramResult result = start(home.path(), "ux");
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(result.out,
              "reply: START VENDOR-1 RETVAL=0\n"
              "outcome: START VENDOR-1 RETVAL=0\n");
    EXPECT_TRUE(home.runs("ux"));
}

TEST_F(VendorAgent, RunsTheHomesProgramsAsThePlugInDoesAnywhere) {
    const ScriptHome home;
    EXPECT_EQ(start(home.path(), "ux").status, 0);
    EXPECT_THAT(home.agentCalls(), ElementsAre("-h " + home.path() + " start ux"));
}

TEST_F(VendorAgent, SaysHowAFailedStartEndedAndTracesItToTheSystemsLog) {
    ScriptHome home;
    home.agentScript("exit 3");
    const std::string command = home.path() + "/bin/TovrinAgent  -h " + home.path() + " start ux";
    const ProgramResult result = start(home.path(), "ux");
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.out,
                HasSubstr("outcome: START VENDOR-1 RETVAL=1024 ZAV1024E " + command + "\n"));
    EXPECT_THAT(
        log.lines(),
        testing::Contains(testing::AllOf(
            StartsWith("<11>vendor-agent: zavtasks:"),
            HasSubstr("ZAV1024E Bad return code from start/stop command [" + command + "]"))));
}

TEST_F(VendorAgent, SaysThatARequestWasRefused) {
    const ScriptHome home;
    const ProgramResult result = start(home.path(), "");
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "reply: START VENDOR-1 RETVAL=1003 ZAV1003E\n");
    EXPECT_THAT(home.agentCalls(), testing::IsEmpty());
}

std::vector<std::string> linesThatBeginWith(const std::string& text, const std::string& start) {
    std::vector<std::string> found;
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
        if (line.compare(0, start.size(), start) == 0) found.push_back(line);
    }
    return found;
}

TEST(VendorConformance, NamesWhatTheExampleLeavesOutAndNothingElse) {
    const ProgramResult result = runProgram({kConformance}, "", {}, std::chrono::seconds(180));
    EXPECT_EQ(result.status, 1) << result.err;
    EXPECT_THAT(
        linesThatBeginWith(result.out, "FAIL"),
        ElementsAre(
            "FAIL  NLS2_GetLocale: opens every code page that the header names "
            "(without 932 943 33722)",
            StartsWith("FAIL  XML1_ParserCreate: lets the caller's encoding override the "
                       "document's (in the locale C: "),
            testing::AllOf(StartsWith("FAIL  XML1_ParseBuffer: hands texts over in the local code "
                                      "page (in the locale C: "),
                           HasSubstr("; reads UTF-16, ISO 8859-1 and marked UTF-8 (in the locale "
                                     "C: "),
                           HasSubstr("; reads a document that declares nothing in the local code "
                                     "page (in the locale C: ")),
            "FAIL  RAS1_Printf: writes texts of any length whole "
            "(a text of 1025 bytes is not whole)",
            testing::AllOf(StartsWith("FAIL  rpc__register_mgr: offers the interface to callers "
                                      "(the driver offers no remote calls)"),
                           HasSubstr("; has several calls served at once "
                                     "(the driver offers no remote calls)"))));
    EXPECT_THAT(result.out, HasSubstr("\n63 of 68 operations fulfilled\n"));
}

TEST(VendorConformance, ChecksTheNamedOperationsOnly) {
    const ProgramResult result = runProgram({kConformance, "FSI1_", "rpc__free"});
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.out,
              "ok    FSI1_NewList\n"
              "ok    FSI1_FetchList\n"
              "ok    FSI1_DeleteList\n"
              "ok    rpc__free\n"
              "4 of 4 operations fulfilled\n");
}

TEST(VendorConformance, RefusesNamesOfNoOperationAndUnknownOptions) {
    EXPECT_EQ(runProgram({kConformance, "nothing"}).status, 2);
    EXPECT_EQ(runProgram({kConformance, "--unknown"}).status, 2);
}

TEST(VendorConformance, ListsEveryPromise) {
    const ProgramResult result = runProgram({kConformance, "--list", "BSS1_PutEnv"});
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.out,
              "BSS1_PutEnv copies its text\n"
              "BSS1_PutEnv replaces the value before, for everybody\n"
              "BSS1_PutEnv refuses what is no setting\n");
}

}  // namespace
