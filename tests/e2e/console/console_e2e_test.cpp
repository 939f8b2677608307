// ctest-label: threaded
// The console in front of a real host.

#include <gtest/gtest.h>

#include <memory>
#include <nlohmann/json.hpp>
#include <string>

#include "ctl/console/served_console.h"
#include "e2e/transfers/push_fixture.h"

namespace {

using nlohmann::json;

class ConsoleOfAHost : public PushFixture {
protected:
    void startAll() {
        home_.products({"ux"}, "exit 0");
        home_.agentScript("exit 0");
        start({}, "depot", ManagedHost::Guards::On);
        console = std::make_unique<console_test::ServedConsole>(host_->socket());
        console->open();
    }
    json get(const std::string& target) const {
        return json::parse(console->ask(console->get(target, console->cookie())).body, nullptr,
                           false);
    }
    RawClient::Answer put(const std::string& path, const std::string& bytes) const {
        return console->ask(console->send("PUT", "/console/depot?path=" + path, bytes));
    }

    std::unique_ptr<console_test::ServedConsole> console;
};

TEST_F(ConsoleOfAHost, PassesTasksAndTheirEventsOn) {
    startAll();
    RawClient events = console->connect();
    events.send(console->get("/v1/events?table=KAGDYST", console->cookie()));
    EXPECT_EQ(events.readUntil("\r\n\r\n").substr(0, 12), "HTTP/1.1 200");
    const auto accepted = console->ask(
        console->send("POST", "/v1/tasks", R"({"command": "START", "product": "ux"})"));
    EXPECT_TRUE(accepted.status == 200 || accepted.status == 202) << accepted.head << accepted.body;
    EXPECT_NE(events.readUntil("\n\n").find("START"), std::string::npos);
    EXPECT_NE(get("/v1/tasks").dump().find("START"), std::string::npos);
}

TEST_F(ConsoleOfAHost, PassesTheHostsRefusalsOn) {
    startAll();
    const auto refused = console->ask(
        console->send("POST", "/v1/tasks", R"({"command": "START", "product": "none"})"));
    EXPECT_EQ(refused.status, 409) << refused.body;
    EXPECT_NE(json::parse(refused.body).value("guard", ""), "");
    EXPECT_EQ(console->ask(console->get("/v1/none", console->cookie())).status, 404);
}

TEST_F(ConsoleOfAHost, PutsAFileIntoTheDepotAndVerifiesIt) {
    startAll();
    const std::string bytes = randomBytes(3'000'000);
    const auto answer = put("ux/package%20a.tar", bytes);
    ASSERT_EQ(answer.status, 200) << answer.body;
    const json document = json::parse(answer.body);
    EXPECT_EQ(document["path"], "ux/package a.tar");
    EXPECT_EQ(document["bytes"], bytes.size());
    EXPECT_EQ(document["verified"], true);
    EXPECT_EQ(document["notes"], json::array());
    EXPECT_EQ(depot("ux/package a.tar"), bytes);
    EXPECT_EQ(get("/v1/depot/sum?path=ux/package%20a.tar")["files"][0]["sha256"],
              document["sha256"]);
}

TEST_F(ConsoleOfAHost, PutsAnEmptyFileIntoTheDepot) {
    startAll();
    const auto answer = put("empty", "");
    EXPECT_EQ(answer.status, 200) << answer.body;
    EXPECT_TRUE(inDepot("empty"));
}

TEST_F(ConsoleOfAHost, RefusesAFileAsPushDoes) {
    startAll();
    const auto damaged = put("install.sh", std::string("\0\r\x1a", 3));
    EXPECT_EQ(damaged.status, 409) << damaged.body;
    const json document = json::parse(damaged.body);
    EXPECT_EQ(document["guard"], "depot-content");
    EXPECT_NE(document["hint"], "");
    EXPECT_EQ(put("../outside", "x").status, 409);
    EXPECT_EQ(depotFiles(), std::vector<std::string>());
}

TEST_F(ConsoleOfAHost, SaysWhatAFileBecomesOnItsWay) {
    startAll();
    const auto answer = put("install.sh", "line\r\n");
    EXPECT_EQ(answer.status, 200) << answer.body;
    EXPECT_EQ(json::parse(answer.body)["notes"].size(), 1U) << answer.body;
    EXPECT_EQ(depot("install.sh"), "line\n");
}

TEST_F(ConsoleOfAHost, SeesItComeBackAfterItWasAway) {
    startAll();
    RawClient events = console->connect();
    events.send(console->get("/v1/events?table=KAGDYST", console->cookie()));
    EXPECT_EQ(events.readUntil("\r\n\r\n").substr(0, 12), "HTTP/1.1 200");
    host_->stop();
    EXPECT_TRUE(events.isClosed());
    EXPECT_EQ(console->ask(console->get("/v1/health", console->cookie())).status, 502);
    EXPECT_EQ(put("file", "x").status, 502);
    host_->start();
    EXPECT_EQ(console->ask(console->get("/v1/health", console->cookie())).status, 200);
}

}  // namespace
