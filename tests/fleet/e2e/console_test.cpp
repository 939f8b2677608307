/// zavctl --fleet URL console, and a browser in front of it, with all programs of a fleet behind.
#include <gtest/gtest.h>

#include <csignal>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>
#include <vector>

#include "ctl/console/browser.h"
#include "support/process/left_running.h"
#include "tests/fleet/e2e/fleet_scene.h"
#include "tests/fleet/e2e/program_fleet.h"

namespace {

using console_test::Browser;
using fleet_e2e::kPatience;
using fleet_e2e::ProgramFleet;
using nlohmann::json;

/// A console that an operator has started, and their browser.
class OpenedConsole {
public:
    OpenedConsole(const ProgramFleet& fleet, const std::string& name)
        : program_(fleet.startZavctl(name, {"console"})), browser_(linkOf(*program_)) {
        browser_.open();
    }
    ~OpenedConsole() { end(); }
    OpenedConsole(const OpenedConsole&) = delete;
    OpenedConsole& operator=(const OpenedConsole&) = delete;

    const Browser& browser() const { return browser_; }
    int end() {
        program_->signal(SIGTERM);
        return program_->wait().status;
    }

    std::pair<int, json> get(const std::string& target) const {
        const auto answer = browser_.ask(browser_.get(target, browser_.cookie()));
        const json document = json::parse(answer.body, nullptr, false);
        return {answer.status, document.is_object() ? document : json::object()};
    }
    json run(const std::string& verb, const std::vector<std::string>& arguments,
             const json& options = json::object()) const {
        const json request = {{"verb", verb}, {"arguments", arguments}, {"options", options}};
        RawClient client = browser_.connect();
        client.send(browser_.send("POST", "/console/run", request.dump()));
        const auto answer = client.readAnswer(kPatience);
        EXPECT_EQ(answer.status, 200) << answer.body;
        return json::parse(answer.body, nullptr, false);
    }

private:
    static std::string linkOf(Program& program) {
        EXPECT_TRUE(program.awaitOutput("console: http://127.0.0.1:", kPatience)) << program.err();
        const std::string out = program.out();
        const std::size_t begin = out.find("http://");
        return begin == std::string::npos ? "http://127.0.0.1:1/open"
                                          : out.substr(begin, out.find('\n') - begin);
    }

    const std::unique_ptr<Program> program_;
    Browser browser_;
};

/// What the console says of the only host; null while that is not there.
json hostIn(const OpenedConsole& console) {
    const json hosts = console.get("/v1/hosts").second.value("hosts", json::array());
    return hosts.empty() ? json() : hosts.front();
}

std::string stateOf(const OpenedConsole& console, const std::string& rollout) {
    return console.get("/v1/rollouts/" + rollout).second.value("state", "");
}

TEST(TheConsoleOfAFleet, ShowsItAndActsByTheOperatorsProgram) {
    ProgramFleet fleet;
    fleet.join("anna", {"--role", "admin"});
    OpenedConsole console(fleet, "anna");

    const json session = console.get("/console/session").second;
    EXPECT_EQ(session["mode"], "fleet");
    EXPECT_EQ(session["operator"], "anna");
    EXPECT_EQ(session["role"], "admin");
    const auto isHere = [&] {
        const json host = hostIn(console);
        return host.is_object() && host.value("state", "") == "here";
    };
    ASSERT_TRUE(eventually(isHere, kPatience));
    EXPECT_EQ(hostIn(console)["name"], "web-1");

    const json on = {{"on", "env=test"}};
    const json dry = console.run("start", {"ux"}, {{"on", "env=test"}, {"dry-run", true}});
    EXPECT_EQ(dry["exit"], 0) << dry;
    EXPECT_EQ(dry["output"]["hosts"].size(), 1U);
    EXPECT_EQ(dry["output"]["order"]["kind"], "START");
    EXPECT_EQ(dry["command"],
              "zavctl --fleet " + fleet.url() + " start ux --dry-run --on env=test");
    EXPECT_TRUE(fleet.home().agentCalls().empty());

    const std::string released = fleet.home().files().path("released");
    fleet.home().agentScript(untilReleased(released));
    const json started = console.run("start", {"ux"}, on);
    ASSERT_EQ(started["exit"], 0) << started;
    const std::string rollout = started["output"].value("rollout", "");
    EXPECT_EQ(stateOf(console, rollout), "running") << "nobody waits for its end";

    const json paused = console.run("rollout pause", {rollout});
    EXPECT_EQ(paused["exit"], 0) << paused;
    EXPECT_EQ(paused["output"]["state"], "paused");
    EXPECT_EQ(stateOf(console, rollout), "paused");
    fleet.home().files().write("released", "");
    EXPECT_EQ(console.run("rollout resume", {rollout})["exit"], 0);
    EXPECT_TRUE(eventually([&] { return stateOf(console, rollout) == "finished"; }, kPatience));
    EXPECT_EQ(fleet.home().agentCalls().size(), 1U);

    const json late = console.run("rollout pause", {rollout});
    EXPECT_NE(late["exit"], 0);
    EXPECT_NE(late["messages"], "");
    EXPECT_EQ(console.run("hosts label", {"web-1", "site=a"})["exit"], 0);
    EXPECT_EQ(hostIn(console)["centreLabels"]["site"], "a");
    EXPECT_EQ(console.end(), 0);
}

TEST(TheConsoleOfAFleet, ChangesNothingForViewersAndStrangers) {
    ProgramFleet fleet;
    fleet.join("victor", {"--role", "viewer"});
    const OpenedConsole console(fleet, "victor");
    EXPECT_EQ(console.get("/console/session").second["role"], "viewer");
    ASSERT_TRUE(eventually([&] { return hostIn(console).is_object(); }, kPatience));
    const json before = hostIn(console)["centreLabels"];

    const json on = {{"on", "env=test"}};
    const std::string id(32, 'a');
    for (const json& ended :
         {console.run("start", {"ux"}, on), console.run("rollout pause", {id}),
          console.run("rollout abort", {id}), console.run("hosts label", {"web-1", "site=a"})}) {
        EXPECT_NE(ended["exit"], 0) << ended;
        EXPECT_NE(ended["messages"], "") << ended;
    }
    EXPECT_EQ(hostIn(console)["centreLabels"], before);
    EXPECT_TRUE(console.get("/v1/rollouts").second["rollouts"].empty());

    const Browser& browser = console.browser();
    const std::string body = R"({"verb":"rollout pause","arguments":[")" + id + R"("]})";
    const std::string begin =
        "POST /console/run HTTP/1.1\r\nHost: " + browser.host() +
        "\r\nX-Zav-Console: 1\r\nContent-Length: " + std::to_string(body.size()) + "\r\n";
    EXPECT_EQ(browser.ask(begin + "\r\n" + body).status, 401);
    EXPECT_EQ(
        browser.ask(begin + browser.cookie() + "Origin: http://evil.example\r\n\r\n" + body).status,
        403);
    EXPECT_EQ(browser.ask(browser.get("/v1/hosts")).status, 401);
    EXPECT_EQ(browser.ask(browser.send("POST", "/v1/rollouts/" + id + "/pause", "{}")).status, 405);
}

}  // namespace
