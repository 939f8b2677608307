// What was accepted is carried out, or its end is told, however the host ends.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>

#include <map>
#include <nlohmann/json.hpp>
#include <optional>
#include <sstream>

#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

using nlohmann::json;
using testing::ElementsAre;
using Guards = ManagedHost::Guards;

class JournalOnDisk : public testing::Test {
protected:
    JournalOnDisk() {
        home.products({"ux", "px", "lx"}, "exit 0");
        // Each task writes a line when it begins and when it ends, and ends when it may.
        home.agentScript("echo begin $product >>'" + notes() + "'\n" + "until [ -e '" + gate() +
                         "' ]; do sleep 0.02; done\n" + "echo end $product >>'" + notes() + "'");
    }

    std::string notes() const { return home.files().path("notes"); }
    std::string gate() const { return home.files().path("gate"); }
    void openGate() const { home.files().write("gate", ""); }

    void start(const std::vector<std::string>& arguments = {}, Guards guards = Guards::On) {
        host.emplace(home.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}}, arguments,
                     guards);
    }
    /// A query that asks for a start.
    static json startOnTheTable(const std::string& product, const std::string& transid = "t") {
        json where = json::array();
        for (const auto& [column, value] : std::map<std::string, std::string>{
                 {"COMMAND", "START"}, {"PRODUCT", product}, {"TRANSID", transid}}) {
            where.push_back({{"column", column}, {"op", "="}, {"value", value}});
        }
        return {{"table", "KAGREQT"}, {"where", where}};
    }
    void killAndStart() {
        host->program().signal(SIGKILL);
        EXPECT_EQ(host->program().wait().status, 128 + SIGKILL);
        host->start();
    }
    json post(const std::string& path, const json& body, unsigned status) const {
        RawClient client(host->socket());
        const auto reply = client.post(path, body.dump());
        EXPECT_EQ(reply.status, status) << reply.body;
        return json::parse(reply.body);
    }
    json get(const std::string& path) const {
        RawClient client(host->socket());
        return json::parse(client.get(path).body);
    }
    std::string accept(const std::string& product) const {
        return post("/v1/tasks", {{"command", "START"}, {"product", product}}, 202)["id"];
    }
    std::string stateOf(const std::string& id, const std::string& wait = "") const {
        return get("/v1/tasks/" + id + wait)["state"];
    }
    bool awaitNote(const std::string& note) const {
        return eventually(
            [&] { return home.files().read("notes").find(note) != std::string::npos; });
    }
    std::vector<std::string> allNotes() const {
        std::istringstream text(home.files().read("notes"));
        std::vector<std::string> lines;
        for (std::string line; std::getline(text, line);)
            lines.push_back(line);
        return lines;
    }

    ScriptHome home;
    std::optional<ManagedHost> host;
};

TEST_F(JournalOnDisk, AKilledHostRunsWhatWaitedInItsOldOrderExactlyOnce) {
    start();
    const std::string identity = get("/v1/health")["journal"];
    const std::string first = accept("ux");
    const std::string second = accept("px");
    const std::string third = accept("lx");
    ASSERT_TRUE(awaitNote("begin ux"));
    killAndStart();
    EXPECT_EQ(get("/v1/health")["journal"], identity);
    EXPECT_EQ(stateOf(first), "interrupted");
    EXPECT_EQ(get("/v1/tasks/" + first)["interruptions"], 1);
    EXPECT_EQ(stateOf(second), "queued") << "the command of the dead host still runs";
    openGate();
    EXPECT_EQ(stateOf(second, "?wait=60"), "done");
    EXPECT_EQ(stateOf(third, "?wait=60"), "done");
    EXPECT_THAT(allNotes(),
                ElementsAre("begin ux", "end ux", "begin px", "end px", "begin lx", "end lx"));
}

TEST_F(JournalOnDisk, AnInterruptedTaskSaysWhatTheInventoryShowsNow) {
    start();
    const std::string id = accept("ux");
    ASSERT_TRUE(awaitNote("begin ux"));
    killAndStart();
    const auto says = [&](const std::string& words) {
        return get("/v1/tasks/" + id)["reason"].get<std::string>().find(words) != std::string::npos;
    };
    EXPECT_TRUE(says("it may have run in part"));
    EXPECT_FALSE(says("inventory")) << "its command still runs";
    home.products({"px"}, "exit 0");
    openGate();
    EXPECT_TRUE(eventually([&] { return says("the inventory does not show ux now"); }))
        << get("/v1/tasks/" + id);
    const std::string second = accept("px");
    const json task = get("/v1/tasks/" + second + "?wait=60");
    EXPECT_EQ(task["state"], "done");
    EXPECT_EQ(task["run"], 2);
    EXPECT_EQ(task["boot"].get<std::string>().size(), 36U) << task;
    EXPECT_FALSE(task.contains("interruptions"));
    EXPECT_EQ(get("/v1/tasks/" + second)["boot"], task["boot"]) << "it is kept";
}

TEST_F(JournalOnDisk, RequestsOnTheTableAreNotForgottenEither) {
    start();
    for (const char* product : {"ux", "px"})
        post("/v1/query", startOnTheTable(product, product), 200);
    ASSERT_TRUE(awaitNote("begin ux"));
    killAndStart();
    openGate();
    EXPECT_EQ(stateOf("ux"), "interrupted");
    EXPECT_EQ(stateOf("px", "?wait=60"), "done");
}

TEST_F(JournalOnDisk, WhileACommandOfADeadHostRunsNothingElseIsQueued) {
    start();
    accept("ux");
    ASSERT_TRUE(awaitNote("begin ux"));
    killAndStart();
    const json query = startOnTheTable("px");
    EXPECT_EQ(post("/v1/query", query, 503)["guard"], "leftovers");
    // What the plug-in does not queue has its answer at once.
    json refused = query;
    for (json& condition : refused["where"]) {
        if (condition["column"] == "COMMAND") condition["value"] = "NOSUCH";
    }
    EXPECT_NE(post("/v1/query", refused, 200)["rows"][0]["RETVAL"], 0);
    openGate();
    ASSERT_TRUE(awaitNote("end ux"));
    EXPECT_TRUE(eventually([&] {
        RawClient client(host->socket());
        return client.post("/v1/query", query.dump()).status == 200;
    }));
}

TEST_F(JournalOnDisk, WithoutGuardsARequestIsQueuedBesideACommandOfADeadHost) {
    start({}, Guards::Off);
    accept("ux");
    ASSERT_TRUE(awaitNote("begin ux"));
    killAndStart();
    post("/v1/query", startOnTheTable("px"), 200);
    EXPECT_TRUE(awaitNote("begin px"));
    openGate();
}

TEST_F(JournalOnDisk, AnOrphanThatTakesTooLongIsKilled) {
    start({"--orphan-wait", "1"});
    accept("ux");
    const std::string second = accept("px");
    ASSERT_TRUE(awaitNote("begin ux"));
    killAndStart();
    ASSERT_TRUE(awaitNote("begin px")) << "it waits for what was never going to end";
    openGate();
    EXPECT_EQ(stateOf(second, "?wait=60"), "done");
    EXPECT_THAT(allNotes(), ElementsAre("begin ux", "begin px", "end px"));
}

TEST_F(JournalOnDisk, SigtermEndsTheTaskInHandAndKeepsTheQueue) {
    start();
    const std::string first = accept("ux");
    const std::string second = accept("px");
    ASSERT_TRUE(awaitNote("begin ux"));
    host->program().signal(SIGTERM);
    openGate();
    const ProgramResult result = host->program().wait();
    EXPECT_EQ(result.status, 0);
    EXPECT_NE(result.err.find("1 tasks wait"), std::string::npos) << result.err;
    EXPECT_THAT(allNotes(), ElementsAre("begin ux", "end ux"));
    host->start();
    EXPECT_EQ(stateOf(first), "done");
    EXPECT_EQ(stateOf(second, "?wait=60"), "done");
}

TEST_F(JournalOnDisk, ARepetitionGetsTheFirstOnesTask) {
    start();
    const json request = {
        {"command", "START"}, {"product", "ux"}, {"transid", "key"}, {"once", true}};
    const std::string id = post("/v1/tasks", request, 202)["id"];
    EXPECT_EQ(post("/v1/tasks", request, 202)["id"], id);
    killAndStart();
    openGate();
    EXPECT_EQ(post("/v1/tasks", request, 202)["id"], id);
    json other = request;
    other["product"] = "px";
    post("/v1/tasks", other, 409);
    EXPECT_EQ(get("/v1/tasks")["tasks"].size(), 1U);
}

TEST_F(JournalOnDisk, ARefusalIsRememberedForItsRepetition) {
    start();
    const json request = {
        {"command", "START"}, {"product", "zz"}, {"transid", "key"}, {"once", true}};
    const json first = post("/v1/tasks", request, 409);
    EXPECT_EQ(first["guard"], "product");
    EXPECT_EQ(post("/v1/tasks", request, 409), first);
    EXPECT_EQ(stateOf("key"), "refused");
    const json never = {{"transid", "never"}, {"once", true}, {"refused", "not on Sundays"}};
    EXPECT_EQ(post("/v1/tasks", never, 202)["state"], "refused");
    EXPECT_EQ(get("/v1/tasks/never")["reason"], "not on Sundays");
}

TEST_F(JournalOnDisk, WhatEndedElsewhereIsRecordedAsItEnded) {
    start();
    for (const char* const state : {"refused", "cancelled", "expired", "done"}) {
        const json told = {{"transid", state}, {"once", true}, {state, "told from outside"}};
        const json task = post("/v1/tasks", told, 202);
        EXPECT_EQ(task["state"], state);
        EXPECT_EQ(task["reason"], "told from outside");
        EXPECT_EQ(task["ended"], task["accepted"]);
        EXPECT_EQ(post("/v1/tasks", told, 202)["id"], task["id"]);
    }
    post("/v1/tasks", {{"transid", "x"}, {"done", "without once"}}, 400);
    post("/v1/tasks", {{"transid", "x"}, {"once", true}, {"done", "y"}, {"expired", "z"}}, 400);
    post("/v1/tasks", {{"transid", "x"}, {"once", true}, {"done", 1}}, 400);
    EXPECT_EQ(get("/v1/tasks")["tasks"].size(), 4U);
    killAndStart();
    EXPECT_EQ(stateOf("done"), "done");
    EXPECT_TRUE(allNotes().empty());
}

TEST_F(JournalOnDisk, WhatWaitsCanBeCancelled) {
    start();
    const std::string first = accept("ux");
    const std::string second = accept("px");
    ASSERT_TRUE(awaitNote("begin ux"));
    EXPECT_EQ(post("/v1/tasks/" + second + "/cancel", nullptr, 200)["state"], "cancelled");
    post("/v1/tasks/" + second + "/cancel", nullptr, 409);
    openGate();
    EXPECT_EQ(stateOf(first, "?wait=60"), "done");
    EXPECT_THAT(allNotes(), ElementsAre("begin ux", "end ux"));
}

TEST_F(JournalOnDisk, WhatTheGraceCutsOffIsInterruptedAndTheQueueStays) {
    start({"--grace", "1"});
    const std::string first = accept("ux");
    const std::string second = accept("px");
    ASSERT_TRUE(awaitNote("begin ux"));
    host->program().signal(SIGTERM);
    const ProgramResult result = host->program().wait();
    EXPECT_EQ(result.status, 0);
    EXPECT_NE(result.err.find("1 tasks wait"), std::string::npos) << result.err;
    openGate();
    host->start();
    EXPECT_EQ(stateOf(first), "interrupted");
    EXPECT_EQ(stateOf(second, "?wait=60"), "done");
}

TEST_F(JournalOnDisk, AHostSaysWhetherItIsReady) {
    start();
    EXPECT_EQ(get("/v1/ready"), (json{{"ready", true}, {"reasons", json::array()}}));
    accept("ux");
    ASSERT_TRUE(awaitNote("begin ux"));
    killAndStart();
    RawClient client(host->socket());
    const auto reply = client.get("/v1/ready");
    EXPECT_EQ(reply.status, 503U);
    EXPECT_EQ(json::parse(reply.body)["reasons"][0]["part"], "leftovers") << reply.body;
    openGate();
    EXPECT_TRUE(eventually([&] { return get("/v1/ready")["ready"] == true; }));
}

TEST_F(JournalOnDisk, ATaskWhoseTimeIsOverExpires) {
    start();
    json request = {{"command", "START"}, {"product", "ux"}, {"expires", "2020-01-01T00:00:00Z"}};
    const std::string id = post("/v1/tasks", request, 202)["id"];
    EXPECT_EQ(stateOf(id, "?wait=60"), "expired");
    request["expires"] = "2020-13-01T00:00:00Z";
    post("/v1/tasks", request, 400);
    EXPECT_EQ(home.agentCalls().size(), 0U);
}

TEST_F(JournalOnDisk, NoMoreTasksWaitThanMay) {
    start({"--max-queued", "1"});
    accept("ux");
    ASSERT_TRUE(awaitNote("begin ux"));
    accept("px");
    RawClient client(host->socket());
    const auto reply = client.post("/v1/tasks", R"({"command": "START", "product": "lx"})");
    EXPECT_EQ(reply.status, 429U);
    openGate();
}

TEST_F(JournalOnDisk, RequestsThatMakeNoSenseAreRefusedByWhatIsWrong) {
    start();
    post("/v1/tasks", {{"command", "GETCONFIG"}, {"product", "ux"}}, 400);
    post("/v1/tasks", {{"product", "ux"}}, 400);
    post("/v1/tasks", {{"command", "START"}, {"product", "ux"}, {"once", true}}, 400);
    post("/v1/tasks", {{"command", "START"}, {"product", "ux"}, {"transid", "t "}}, 400);
    post("/v1/tasks", {{"command", "START"}, {"product", "ux"}, {"journal", "other"}}, 412);
    EXPECT_EQ(get("/v1/tasks")["tasks"].size(), 0U);
}

TEST_F(JournalOnDisk, TheListComesInPages) {
    start();
    openGate();
    std::string last;
    for (const char* product : {"ux", "px", "lx"})
        last = accept(product);
    EXPECT_EQ(stateOf(last, "?wait=60"), "done");
    const json page = get("/v1/tasks?limit=2");
    ASSERT_EQ(page["tasks"].size(), 2U);
    EXPECT_EQ(page["tasks"][0]["product"], "lx");
    const json rest = get("/v1/tasks?limit=2&after=" + page["next"].dump());
    ASSERT_EQ(rest["tasks"].size(), 1U);
    EXPECT_EQ(rest["tasks"][0]["product"], "ux");
    EXPECT_EQ(rest["next"], nullptr);
}

TEST_F(JournalOnDisk, ItsDirectoryIsTheHostsOwn) {
    start();
    struct stat found {};
    ASSERT_EQ(::stat((home.path() + "/zavhost").c_str(), &found), 0);
    EXPECT_EQ(found.st_mode & 0777U, 0700U);
    ASSERT_EQ(::stat((home.path() + "/zavhost/journal.db").c_str(), &found), 0);
    EXPECT_EQ(found.st_mode & 0777U, 0600U);
}

TEST_F(JournalOnDisk, ThereIsNoneWithoutIt) {
    start({"--no-journal"});
    openGate();
    EXPECT_EQ(stateOf(accept("ux"), "?wait=60"), "done");
    EXPECT_FALSE(home.files().exists("home/zavhost"));
}

}  // namespace
