// ctest-label: threaded
// "zavctl console" as a user types it.

#include <gtest/gtest.h>

#include <csignal>
#include <nlohmann/json.hpp>
#include <string>

#include "e2e/transfers/push_fixture.h"
#include "http/tcp_client.h"

namespace {

using nlohmann::json;

class ConsoleProgram : public PushFixture {
protected:
    ConsoleProgram() { start({}, "depot", ManagedHost::Guards::On); }

    /// The link of a console that has been started.
    static std::string linkOf(const Program& program) {
        const std::string out = program.out();
        return out.substr(out.find("http://"),
                          out.find_last_not_of('\n') + 1 - out.find("http://"));
    }
    static std::uint16_t portOf(const std::string& link) {
        const std::string begin = "http://127.0.0.1:";
        return static_cast<std::uint16_t>(std::stoi(link.substr(begin.size())));
    }
    static RawClient::Answer get(std::uint16_t port, const std::string& target,
                                 const std::string& lines = "") {
        RawClient client = http_test::tcpClient(port);
        client.send("GET " + target + " HTTP/1.1\r\nHost: 127.0.0.1:" + std::to_string(port) +
                    "\r\n" + lines + "\r\n");
        return client.readAnswer();
    }
    std::vector<std::string> command(const std::vector<std::string>& more = {}) const {
        std::vector<std::string> words = {zavctlPath(), "--socket", host_->socket(), "console"};
        words.insert(words.end(), more.begin(), more.end());
        return words;
    }
};

TEST_F(ConsoleProgram, PrintsALinkThatOpensItsPageAndServesUntilItIsEnded) {
    Program program(command());
    ASSERT_TRUE(program.awaitOutput("\n", std::chrono::seconds(20))) << program.err();
    const std::string link = linkOf(program);
    EXPECT_EQ(program.out(), "console: " + link + "\n");
    const std::uint16_t port = portOf(link);
    const auto opened = get(port, link.substr(link.find("/open")));
    ASSERT_EQ(opened.status, 303) << opened.head;
    const std::size_t at = opened.head.find("zav_console=");
    const std::string cookie =
        "Cookie: " + opened.head.substr(at, opened.head.find(';', at) - at) + "\r\n";
    EXPECT_NE(get(port, "/", cookie).body.find("<!doctype html>"), std::string::npos);
    EXPECT_EQ(get(port, "/app.js", cookie).status, 200);
    EXPECT_EQ(get(port, "/v1/health", cookie).status, 200);
    const json session = json::parse(get(port, "/console/session", cookie).body);
    EXPECT_EQ(session["command"], json::array({"zavctl", "--socket", host_->socket()}));
    program.signal(SIGTERM);
    EXPECT_EQ(program.wait().status, 0);
    EXPECT_FALSE(http_test::tcpClient(port).connected());
    EXPECT_EQ(program.err(), "");
    EXPECT_EQ(program.out(), "console: " + link + "\n") << "nothing secret is told besides";
}

TEST_F(ConsoleProgram, TakesThePortThatItIsGivenUnlessSomebodyHasIt) {
    const sys::FileDescriptor taken = http_test::listener();
    const std::string port = std::to_string(http_test::portOf(taken));
    const ProgramResult result = runProgram(command({"--port", port}));
    EXPECT_EQ(result.status, 2);
    EXPECT_NE(result.err.find("127.0.0.1 port " + port), std::string::npos) << result.err;
}

TEST_F(ConsoleProgram, TellsProgramsItsLinkAsADocument) {
    std::vector<std::string> words = command();
    words.emplace_back("--json");
    Program program(words);
    ASSERT_TRUE(program.awaitOutput("}\n", std::chrono::seconds(20))) << program.err();
    EXPECT_EQ(json::parse(program.out())["console"].get<std::string>().substr(0, 17),
              "http://127.0.0.1:");
    program.signal(SIGINT);
    EXPECT_EQ(program.wait().status, 0);
}

}  // namespace
