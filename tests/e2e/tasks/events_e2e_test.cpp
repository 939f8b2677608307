// Outcomes reach their readers once each, whatever happens to host and connection.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>

#include <nlohmann/json.hpp>
#include <optional>

#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

using nlohmann::json;
using testing::ElementsAre;
using testing::HasSubstr;
using Guards = ManagedHost::Guards;

class EventsOfTasks : public testing::Test {
protected:
    EventsOfTasks() { home.products({"ux"}, "exit 0"); }

    void start(const std::vector<std::string>& arguments = {}) {
        host.emplace(home.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}}, arguments,
                     Guards::On);
    }
    void killAndStart() {
        host->program().signal(SIGKILL);
        EXPECT_EQ(host->program().wait().status, 128 + SIGKILL);
        host->start();
    }
    void stopAndStart() {
        host->stop();
        host->start();
    }
    void run(const std::string& transid) const {
        const ProgramResult result = host->zavctl({"start", "ux", "--transid", transid});
        EXPECT_EQ(result.status, 0) << result.err;
    }
    json get(const std::string& path) const {
        RawClient client(host->socket());
        return json::parse(client.get(path).body);
    }
    json post(const std::string& path, const json& body) const {
        RawClient client(host->socket());
        return json::parse(client.post(path, body.dump()).body);
    }
    /// A reader of what comes behind this event. Of the answer only the events are left.
    RawClient follow(const std::string& after) const {
        RawClient client(host->socket());
        client.send("GET /v1/events?table=KAGDYST&tasks=1 HTTP/1.1\r\nLast-Event-ID: " + after +
                    "\r\n\r\n");
        EXPECT_EQ(client.readUntil("\r\n\r\n").find("HTTP/1.1 200"), 0U);
        return client;
    }
    static std::vector<std::string> transidsIn(const std::string& document) {
        std::vector<std::string> found;
        const json whole = json::parse(document);
        for (const json& row : whole["events"])
            found.push_back(row["TRANSID"]);
        return found;
    }
    /// The identifier behind which everything lies.
    std::string beginning() const { return get("/v1/health")["journal"].get<std::string>() + "-0"; }

    ScriptHome home;
    std::optional<ManagedHost> host;
};

TEST_F(EventsOfTasks, ReachAReaderOnceEachAcrossStopsAndKills) {
    start();
    const auto reader = host->startZavctl({"--timeout", "90", "events", "--count", "4", "--ids"});
    ASSERT_TRUE(eventually([&] { return get("/v1/health")["subscriptions"] == 1; }));
    killAndStart();  // before the first one
    run("T1");
    ASSERT_TRUE(reader->awaitOutput("\"T1\"", std::chrono::seconds(20)));
    stopAndStart();
    run("T2");
    run("T3");
    killAndStart();
    run("T4");
    const ProgramResult result = reader->wait(std::chrono::seconds(60));
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_THAT(transidsIn(result.out), ElementsAre("T1", "T2", "T3", "T4"));
    EXPECT_THAT(result.err, HasSubstr("the connection to the host is lost; trying again\n"));
    const std::string second = json::parse(result.out)["events"][1]["id"];
    const ProgramResult rest =
        host->zavctl({"--json", "--timeout", "20", "events", "--since", second, "--count", "2"});
    EXPECT_THAT(transidsIn(rest.out), ElementsAre("T3", "T4"));
    EXPECT_EQ(rest.err, "");
}

TEST_F(EventsOfTasks, ThatAreGoneAreToldInWords) {
    start({"--keep-rows", "1"});
    for (const char* transid : {"T1", "T2", "T3"})
        run(transid);
    stopAndStart();  // old rows are removed up to a second after a new one, and before the end
    const ProgramResult pruned = host->zavctl(
        {"--json", "--timeout", "20", "events", "--since", beginning(), "--count", "1"});
    EXPECT_THAT(transidsIn(pruned.out), ElementsAre("T3"));
    // Each of the tasks had a row and an end.
    EXPECT_EQ(pruned.err,
              "zavctl: 4 events are missing here: the host does not keep them any more\n");
    const ProgramResult foreign = host->zavctl(
        {"--json", "--timeout", "20", "events", "--since", "feedfeedfeedfeed-7", "--count", "1"});
    EXPECT_THAT(transidsIn(foreign.out), ElementsAre("T3"));
    EXPECT_THAT(foreign.err, HasSubstr("it has another journal"));
    EXPECT_EQ(host->zavctl({"events", "--since", "T1"}).status, 2);
}

TEST_F(EventsOfTasks, TellEveryEndEvenOfTasksWithoutARow) {
    home.agentScript("until [ -e '" + home.files().path("gate") + "' ]; do sleep 0.02; done");
    start();
    const auto accept = [this](const char* name, const char* expires) {
        json body = {{"command", "START"}, {"product", "ux"}, {"transid", name}};
        if (expires != nullptr) body["expires"] = expires;
        return post("/v1/tasks", body)["id"].get<std::string>();
    };
    const std::string cutOff = accept("cut off", nullptr);
    const std::string cancelled = accept("cancelled", nullptr);
    accept("expired", "2020-01-01T00:00:00Z");
    accept("done", nullptr);
    ASSERT_TRUE(eventually([&] { return home.agentCalls().size() == 1; }));
    post("/v1/tasks/" + cancelled + "/cancel", nullptr);
    const std::string journal = beginning();
    killAndStart();
    home.files().write("gate", "");
    RawClient reader = follow(journal);
    std::string text;
    while (text.find("\"state\":\"done\"") == std::string::npos) {
        const std::string event = reader.readUntil("\n\n");
        ASSERT_NE(event, "") << text;
        text += event;
    }
    const std::size_t first = text.find("\"transid\":\"cancelled\"");
    const std::size_t second = text.find("\"transid\":\"cut off\"");
    const std::size_t third = text.find("\"transid\":\"expired\"");
    const std::size_t last = text.find("\"transid\":\"done\"");
    EXPECT_LT(first, second) << text;
    EXPECT_LT(second, third) << text;
    EXPECT_LT(third, last) << text;
    for (const char* state : {"cancelled", "interrupted", "expired", "done"})
        EXPECT_THAT(text, HasSubstr("\"state\":\"" + std::string(state) + "\""));
}

}  // namespace
