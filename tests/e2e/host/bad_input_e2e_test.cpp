// What a host and its control program do with input that makes no sense.
// ctest-label: threaded

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <nlohmann/json.hpp>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

using nlohmann::json;

std::string post(const std::string& target, const std::string& body) {
    return "POST " + target + " HTTP/1.1\r\nHost: x\r\nConnection: close\r\nContent-Length: " +
           std::to_string(body.size()) + "\r\n\r\n" + body;
}

std::string get(const std::string& target) {
    return "GET " + target + " HTTP/1.1\r\nHost: x\r\nConnection: close\r\n\r\n";
}

int statusOf(const std::string& answer) {
    return answer.rfind("HTTP/1.1 ", 0) == 0 ? std::atoi(answer.c_str() + 9) : -1;
}

json bodyOf(const std::string& answer) {
    const std::size_t at = answer.find("\r\n\r\n");
    return at == std::string::npos ? json() : json::parse(answer.substr(at + 4), nullptr, false);
}

struct StartupCase {
    const char* what;
    std::vector<std::string> arguments;
};

TEST(BadInput, AHostThatCannotStartSaysWhyInOneLineAndEndsWithOne) {
    ScriptHome home;
    ScratchDir scratch;
    const std::string socket = scratch.path("s");
    const std::string noLibrary = scratch.write("no-library.so", "text");
    const StartupCase cases[] = {
        {"no home at all", {"--socket", socket}},
        {"a home that does not exist", {"--home", "/nonexistent/home", "--socket", socket}},
        {"a home that is a file", {"--home", noLibrary, "--socket", socket}},
        {"a plug-in that is none",
         {"--home", home.path(), "--socket", socket, "--plugin", noLibrary}},
        {"a plug-in that is none, unguarded",
         {"--unguarded", "--home", home.path(), "--socket", socket, "--plugin", noLibrary}},
        {"a plug-in that does not exist",
         {"--home", home.path(), "--socket", socket, "--plugin", "/nonexistent.so"}},
        {"a library that is no plug-in",
         {"--home", home.path(), "--socket", socket, "--plugin",
          ZAV_BUILD_DIR "/lib/libzavplatform.so"}},
        {"a socket that cannot be made, unguarded",
         {"--unguarded", "--home", home.path(), "--socket", "/nonexistent/dir/socket"}},
        {"a socket that cannot be made",
         {"--home", home.path(), "--socket", "/nonexistent/dir/socket"}},
        {"a socket path that is too long",
         {"--home", home.path(), "--socket", "/tmp/" + std::string(200, 'x')}},
    };
    for (const StartupCase& c : cases) {
        std::vector<std::string> argv = {zavhostPath()};
        argv.insert(argv.end(), c.arguments.begin(), c.arguments.end());
        const ProgramResult result =
            runProgram(argv, "", {{"TOVRINHOME", ""}, {"KBB_RAS1_LOG", "/dev/null"}});
        EXPECT_EQ(result.status, 1) << c.what;
        EXPECT_EQ(result.out, "") << c.what;
        EXPECT_EQ(std::count(result.err.begin(), result.err.end(), '\n'), 1)
            << c.what << ": " << result.err;
    }
}

TEST(BadInput, ALiveSocketIsLeftAloneAndAStaleOneReplaced) {
    ScriptHome home;
    ManagedHost host(home.path());
    const ProgramResult second = runProgram(
        {zavhostPath(), "--unguarded", "--home", home.path(), "--socket", host.socket()});
    EXPECT_EQ(second.status, 1);
    EXPECT_EQ(host.zavctl({"status"}).status, 0) << "the first host still serves";

    host.program().signal(SIGKILL);
    host.program().wait();
    struct stat found {};
    ASSERT_EQ(::stat(host.socket().c_str(), &found), 0) << "a killed host leaves its socket";
    host.start();
    EXPECT_EQ(host.zavctl({"status"}).status, 0);
    ASSERT_EQ(::stat(host.socket().c_str(), &found), 0);
    EXPECT_EQ(found.st_mode & 0777, 0600U);
}

TEST(BadInput, RequestsThatMakeNoSenseAreRefusedAndRunNothing) {
    ScriptHome home;
    ManagedHost host(home.path());
    const std::pair<std::string, int> cases[] = {
        {get("/"), 404},
        {get("/v1/nope"), 404},
        {get("/v1/query"), 405},
        {post("/v1/health", "{}"), 405},
        {get("/v1/events"), 400},
        {get("/v1/events?table=NOPE"), 404},
        {get("/v1/events?table=KAGDYST&nope=1"), 400},
        {get("/v1/events?table=KAGDYST&transid=1"), 400},
        {post("/v1/query", ""), 400},
        {post("/v1/query", "{"), 400},
        {post("/v1/query", "[]"), 400},
        {post("/v1/query", "{\"table\": 3}"), 400},
        {post("/v1/query", "{\"table\": \"NOPE\"}"), 404},
        {post("/v1/query", "{\"table\": \"KAGREQT\", \"where\": 1}"), 400},
        {post("/v1/query", "{\"table\": \"KAGREQT\", \"where\": [1]}"), 400},
        {post(
             "/v1/query",
             R"({"table": "KAGREQT", "where": [{"column": "command", "op": "=", "value": "START"}]})"),
         400},
        {post(
             "/v1/query",
             R"({"table": "KAGREQT", "where": [{"column": "COMMAND", "op": "~", "value": "START"}]})"),
         400},
        {post("/v1/query",
              R"({"table": "KAGREQT", "where": [{"column": "COMMAND", "op": "=", "value": {}}]})"),
         400},
        {post("/v1/query",
              R"({"table": "KAGREQT", "where": [{"column": "RETVAL", "op": "=", "value": "x"}]})"),
         400},
        {post("/v1/query", std::string(1100 * 1024, ' ')), 413},
    };
    for (const auto& [request, expected] : cases) {
        const std::string answer = host.exchange(request);
        EXPECT_EQ(statusOf(answer), expected) << request.substr(0, 200) << "\n" << answer;
        EXPECT_FALSE(bodyOf(answer).value("error", "").empty()) << request.substr(0, 200);
    }
    EXPECT_NE(
        host.exchange(
                post("/v1/query",
                     R"({"table":"KINAGT","where":[{"column":"nope","op":"=","value":"x"}]})"))
            .find("nope"),
        std::string::npos)
        << "the column is named";
    EXPECT_TRUE(home.agentCalls().empty());
    EXPECT_EQ(host.zavctl({"status"}).status, 0);
}

TEST(BadInput, BytesThatAreNoHttpEndTheirConnectionOnly) {
    ScriptHome home;
    ManagedHost host(home.path());
    const std::string cases[] = {
        std::string("\0\0\0\0", 4),
        "GET\r\n\r\n",
        std::string(100000, 'A'),
        "GET / HTTP/9.9\r\n\r\n",
        "POST /v1/query HTTP/1.1\r\nContent-Length: -1\r\n\r\n",
        "POST /v1/query HTTP/1.1\r\nContent-Length: 99999999999999999999\r\n\r\n",
        "GET / HTTP/1.1\r\nX: " + std::string(100000, 'h') + "\r\n\r\n",
    };
    for (const std::string& bytes : cases) {
        const std::string answer = host.exchange(bytes);
        if (!answer.empty()) {
            EXPECT_GE(statusOf(answer), 400);
        }
        EXPECT_EQ(host.zavctl({"status"}).status, 0);
    }
}

TEST(BadInput, ARequestIsAnsweredWithTheCodeOfTheLastMissingParameter) {
    ScriptHome home;
    ManagedHost host(home.path());
    const json none = json::parse(host.zavctl({"--json", "query", "KAGREQT"}).out)["rows"];
    ASSERT_EQ(none.size(), 1U);
    EXPECT_EQ(none[0]["RETVAL"], 1002);
    EXPECT_EQ(none[0]["RETMSGID"], "ZAV1002E");
    const json lower = json::parse(
        host.zavctl({"--json", "query", "KAGREQT", "COMMAND=start", "TRANSID=1"}).out)["rows"];
    EXPECT_EQ(lower[0]["RETVAL"], 1006);
    EXPECT_EQ(lower[0]["RETMSGPARM"], "start");
}

TEST(BadInput, ALongContextIsCutInTheReplyRowWhichStillComes) {
    ScriptHome home;
    ManagedHost host(home.path());
    const std::string context(5000, 'c');
    const json rows = json::parse(host.zavctl({"--json", "query", "KAGREQT", "COMMAND=JUMP",
                                               "TRANSID=1", "CONTEXT=" + context})
                                      .out)["rows"];
    ASSERT_EQ(rows.size(), 1U);
    EXPECT_EQ(rows[0]["CONTEXT"], std::string(3072, 'c'));
}

TEST(BadInput, TheControlProgramTellsItsKindsOfFailureApart) {
    ScriptHome home;
    ManagedHost host(home.path());
    EXPECT_EQ(host.zavctl({"nope"}).status, 2);
    EXPECT_EQ(host.zavctl({}).status, 2);
    EXPECT_EQ(host.zavctl({"start"}).status, 2);
    EXPECT_EQ(host.zavctl({"query", "NOPE"}).status, 2);
    EXPECT_EQ(host.zavctl({"query", "KINAGT", "nope=1"}).status, 2);
    EXPECT_EQ(host.zavctl({"query", "KINAGT", "nothing"}).status, 2);
    EXPECT_EQ(host.zavctl({"stop", "ux", "--instance", "i"}).status, 2);
    EXPECT_EQ(host.zavctl({"--timeout", "x", "status"}).status, 2);
    EXPECT_EQ(runProgram({zavctlPath(), "--socket", "/nonexistent/socket", "status"}).status, 3);
    EXPECT_EQ(host.zavctl({"--help"}).status, 0);
}

TEST(BadInput, WithoutADepotDirectoryEveryCommandIsRefused) {
    ScriptHome home;
    const std::string file = home.files().write("file", "");
    ManagedHost host(home.path(), {{"QVSDEPLOY_AGENTDEPOT", file + "/depot"}});
    EXPECT_NE(host.trace().find("ZAV1010E No Agent Depot directory set"), std::string::npos);
    const ProgramResult result = host.zavctl({"--json", "start", "ux"});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(json::parse(result.out)["reply"]["RETVAL"], 1006);
    EXPECT_TRUE(home.agentCalls().empty());
}

TEST(BadInput, WithoutAHomeInTheEnvironmentTheOptionIsEnough) {
    ScriptHome home;
    ManagedHost host(home.path(), {{"TOVRINHOME", ""}});
    EXPECT_EQ(json::parse(host.zavctl({"--json", "status"}).out)["home"], home.path());
}

}  // namespace
