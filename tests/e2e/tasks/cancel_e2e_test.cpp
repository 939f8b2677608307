// A task that runs is cancelled: what it has started ends, and it starts nothing more.
// ctest-label: threaded

#include <gtest/gtest.h>
#include <signal.h>

#include <map>
#include <nlohmann/json.hpp>
#include <optional>
#include <thread>

#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

using nlohmann::json;

class CancelledTasks : public testing::Test {
protected:
    explicit CancelledTasks(ManagedHost::Guards guards = ManagedHost::Guards::On) {
        home.products({"ux", "px"}, "exit 0");
        // Notes what it does, and an agent that only runs while its start was not cut off.
        home.agentScript("note() { echo $1 $verb $product >>'" + path("notes") + "'; }\n" +
                         "note begin\n" + "until [ -e '" + path("gate") +
                         "' ]; do sleep 0.02; done\n" + "note end");
        host.emplace(home.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}},
                     std::vector<std::string>{}, guards);
    }

    std::string path(const std::string& name) const { return home.files().path(name); }
    std::string notes() const { return home.files().read("notes"); }
    bool awaitNote(const std::string& note) const {
        return eventually([&] { return notes().find(note) != std::string::npos; });
    }
    RawClient::Answer post(const std::string& target, const json& body) const {
        RawClient client(host->socket());
        return client.post(target, body.dump());
    }
    std::string accept(const std::string& command, const std::string& product) const {
        const auto reply = post("/v1/tasks", {{"command", command}, {"product", product}});
        EXPECT_EQ(reply.status, 202U) << reply.body;
        return json::parse(reply.body)["id"];
    }
    void queueOnTheTable(const std::string& product, const std::string& transid) const {
        json where = json::array();
        for (const auto& [column, value] : std::map<std::string, std::string>{
                 {"COMMAND", "START"}, {"PRODUCT", product}, {"TRANSID", transid}}) {
            where.push_back({{"column", column}, {"op", "="}, {"value", value}});
        }
        EXPECT_EQ(post("/v1/query", {{"table", "KAGREQT"}, {"where", where}}).status, 200U);
    }
    RawClient::Answer cancel(const std::string& id) const {
        return post("/v1/tasks/" + id + "/cancel", nullptr);
    }
    json task(const std::string& id, const std::string& wait = "") const {
        RawClient client(host->socket());
        return json::parse(client.get("/v1/tasks/" + id + wait).body);
    }

    ScriptHome home;
    std::optional<ManagedHost> host;
};

TEST_F(CancelledTasks, AreOverWhenTheirCommandsHaveEnded) {
    const std::string id = accept("START", "ux");
    ASSERT_TRUE(awaitNote("begin start ux"));
    const auto reply = cancel(id);
    EXPECT_EQ(reply.status, 200U) << reply.body;
    const json cancelled = json::parse(reply.body);
    EXPECT_EQ(cancelled["state"], "cancelled");
    EXPECT_EQ(cancelled["events"].size(), 1U) << "the plug-in's row stays";
    EXPECT_EQ(cancelled["details"]["commands"][0]["signal"], SIGTERM);
    EXPECT_NE(cancelled["reason"], "");
    EXPECT_EQ(notes(), "begin start ux\n");
}

TEST_F(CancelledTasks, StartNothingMore) {
    const std::string id = accept("RESTART", "ux");
    ASSERT_TRUE(awaitNote("begin stop ux"));
    EXPECT_EQ(cancel(id).status, 200U);
    EXPECT_EQ(task(id)["state"], "cancelled");
    EXPECT_EQ(notes(), "begin stop ux\n") << "no agent was started afterwards";
}

TEST_F(CancelledTasks, LetTheNextOneRun) {
    const std::string first = accept("START", "ux");
    const std::string second = accept("START", "px");
    ASSERT_TRUE(awaitNote("begin start ux"));
    EXPECT_EQ(cancel(first).status, 200U);
    home.files().write("gate", "");
    EXPECT_EQ(task(second, "?wait=60")["state"], "done");
    EXPECT_EQ(notes(), "begin start ux\nbegin start px\nend start px\n");
}

TEST_F(CancelledTasks, AreNotThoseThatTheQueueOfThePluginHolds) {
    queueOnTheTable("ux", "first");
    queueOnTheTable("px", "second");
    ASSERT_TRUE(awaitNote("begin start ux"));
    const auto reply = cancel("second");
    EXPECT_EQ(reply.status, 409U);
    EXPECT_NE(reply.body.find("waits in the plug-in"), std::string::npos) << reply.body;
    EXPECT_EQ(cancel("first").status, 200U) << "one that runs can be, whichever way it came";
    home.files().write("gate", "");
    EXPECT_EQ(task("second", "?wait=60")["state"], "done");
}

TEST_F(CancelledTasks, ThatAreOverSayHowTheyEnded) {
    home.files().write("gate", "");
    const std::string id = accept("START", "ux");
    EXPECT_EQ(task(id, "?wait=60")["state"], "done");
    const auto reply = cancel(id);
    EXPECT_EQ(reply.status, 409U);
    EXPECT_NE(reply.body.find("over already: done"), std::string::npos) << reply.body;
}

TEST_F(CancelledTasks, StaySoWhenTheHostIsKilledMeanwhile) {
    home.agentScript("trap '' TERM\necho begin >>'" + path("notes") + "'\nuntil [ -e '" +
                     path("gate") + "' ]; do sleep 0.02; done");
    const std::string id = accept("START", "ux");
    ASSERT_TRUE(awaitNote("begin"));
    std::thread asking([&] { cancel(id); });
    EXPECT_TRUE(eventually([&] { return task(id).value("cancelling", false); }));
    host->program().signal(SIGKILL);
    EXPECT_EQ(host->program().wait().status, 128 + SIGKILL);
    asking.join();
    host->start();
    EXPECT_EQ(task(id)["state"], "cancelled");
    home.files().write("gate", "");
}

/// Of an unguarded host: what is refused, and how one ends, is the same.
class CancelledWithoutGuards : public CancelledTasks {
protected:
    CancelledWithoutGuards() : CancelledTasks(ManagedHost::Guards::Off) {}
};

TEST_F(CancelledWithoutGuards, StartNothingMoreEither) {
    const std::string id = accept("RESTART", "ux");
    ASSERT_TRUE(awaitNote("begin stop ux"));
    EXPECT_EQ(cancel(id).status, 200U);
    EXPECT_EQ(task(id)["state"], "cancelled");
    EXPECT_EQ(notes(), "begin stop ux\n");
}

}  // namespace
