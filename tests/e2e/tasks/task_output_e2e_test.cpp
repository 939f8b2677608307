// What a task's commands write, while they write it.
// ctest-label: threaded

#include <gtest/gtest.h>
#include <signal.h>

#include <fstream>
#include <nlohmann/json.hpp>
#include <optional>

#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"
#include "support/process/vfork.h"

namespace {

// In KiB. Instrumented programs keep freed memory for a while, a quarter of a GiB of it.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr long kMostMemory = 800 * 1024;
#else
constexpr long kMostMemory = 200 * 1024;
#endif

using nlohmann::json;

class TaskOutput : public testing::Test {
protected:
    void start(const std::vector<std::string>& arguments = {}) {
        host.emplace(home.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}}, arguments,
                     ManagedHost::Guards::On);
    }
    std::string path(const std::string& name) const { return home.files().path(name); }
    RawClient::Answer post(const json& body) const {
        RawClient client(host->socket());
        return client.post("/v1/tasks", body.dump());
    }
    /// An install that runs this script.
    std::string install(const std::string& script) const {
        const auto reply = post({{"command", "INSTALL"},
                                 {"product", "ux"},
                                 {"version", "010000000"},
                                 {"context", "/bin/sh " + script}});
        EXPECT_EQ(reply.status, 202U) << reply.body;
        return json::parse(reply.body)["id"];
    }
    json task(const std::string& id, const std::string& wait = "") const {
        RawClient client(host->socket());
        return json::parse(client.get("/v1/tasks/" + id + wait).body);
    }

    ScriptHome home;
    std::optional<ManagedHost> host;
};

/// The event but for its first line, if that is an identifier.
std::string withoutIdentifier(const std::string& event) {
    return event.rfind("id: ", 0) == 0 ? event.substr(event.find('\n') + 1) : event;
}

TEST_F(TaskOutput, IsFollowedToItsEnd) {
    start();
    const std::string id =
        install(home.files().script("script", "echo one; until [ -e '" + path("go") +
                                                  "' ]; do sleep 0.02; done; echo two >&2"));
    RawClient client(host->socket());
    client.send("GET /v1/tasks/" + id + "/output?follow=1 HTTP/1.1\r\nHost: x\r\n\r\n");
    EXPECT_NE(client.readUntil("\r\n\r\n").find("text/event-stream"), std::string::npos);
    EXPECT_EQ(withoutIdentifier(client.readUntil("\n\n")),
              "data: {\"stream\":\"stdout\",\"text\":\"one\\n\"}\n\n");
    home.files().write("go", "");
    EXPECT_EQ(withoutIdentifier(client.readUntil("\n\n")),
              "data: {\"stream\":\"stderr\",\"text\":\"two\\n\"}\n\n");
    EXPECT_EQ(client.readUntil("\n\n"), "event: end\ndata: {\"state\":\"done\"}\n\n");
    EXPECT_TRUE(client.isClosed()) << "the stream is over";
}

TEST_F(TaskOutput, GoesOnBehindThePieceThatIsNamed) {
    start();
    const std::string id =
        install(home.files().script("script", "echo one; until [ -e '" + path("go") +
                                                  "' ]; do sleep 0.02; done; echo two; exit 3"));
    const std::string get = "GET /v1/tasks/" + id + "/output?follow=1";
    std::string identifier;
    {
        RawClient client(host->socket());
        client.send(get + " HTTP/1.1\r\nHost: x\r\n\r\n");
        client.readUntil("\r\n\r\n");
        const std::string event = client.readUntil("\n\n");
        ASSERT_EQ(event.rfind("id: ", 0), 0U) << event;
        identifier = event.substr(4, event.find('\n') - 4);
    }
    RawClient byParameter(host->socket());
    byParameter.send(get + "&after=" + identifier + " HTTP/1.1\r\nHost: x\r\n\r\n");
    RawClient byField(host->socket());
    byField.send(get + " HTTP/1.1\r\nHost: x\r\nLast-Event-ID: " + identifier + "\r\n\r\n");
    for (RawClient* const client : {&byParameter, &byField})
        EXPECT_NE(client->readUntil("\r\n\r\n").find("200 OK"), std::string::npos);
    home.files().write("go", "");
    for (RawClient* const client : {&byParameter, &byField}) {
        EXPECT_EQ(withoutIdentifier(client->readUntil("\n\n")),
                  "data: {\"stream\":\"stdout\",\"text\":\"two\\n\"}\n\n");
        EXPECT_EQ(client->readUntil("\n\n"), "event: end\ndata: {\"state\":\"failed\"}\n\n");
    }
    // What is kept of it knows the position, too, after the next start of the host.
    host->program().signal(SIGTERM);
    EXPECT_EQ(host->program().wait().status, 0);
    host->start();
    RawClient later(host->socket());
    later.send(get + "&after=" + identifier + " HTTP/1.1\r\nHost: x\r\n\r\n");
    later.readUntil("\r\n\r\n");
    EXPECT_EQ(withoutIdentifier(later.readUntil("\n\n")),
              "data: {\"stream\":\"stdout\",\"text\":\"two\\n\"}\n\n");
    RawClient wrong(host->socket());
    EXPECT_EQ(wrong.get("/v1/tasks/" + id + "/output?after=x").status, 400);
}

TEST_F(TaskOutput, OfATaskThatIsOverIsWhatWasKept) {
    start();
    const std::string id = install(home.files().script("script", "echo one; exit 3"));
    EXPECT_EQ(task(id, "?wait=60")["state"], "failed");
    for (const char* follow : {"", "?follow=1"}) {
        RawClient client(host->socket());
        client.send("GET /v1/tasks/" + id + "/output" + follow + " HTTP/1.1\r\nHost: x\r\n\r\n");
        client.readUntil("\r\n\r\n");
        EXPECT_EQ(withoutIdentifier(client.readUntil("\n\n")),
                  "data: {\"stream\":\"stdout\",\"text\":\"one\\n\"}\n\n");
        EXPECT_EQ(client.readUntil("\n\n"), "event: end\ndata: {\"state\":\"failed\"}\n\n");
    }
}

/// The most memory that the process has used, in KiB.
long mostMemory(pid_t pid) {
    std::ifstream status("/proc/" + std::to_string(pid) + "/status");
    for (std::string line; std::getline(status, line);) {
        if (line.rfind("VmHWM:", 0) == 0) return std::stol(line.substr(6));
    }
    return -1;
}

TEST_F(TaskOutput, WithoutEndEndsTheTaskAndNotTheHostsMemory) {
    start();
    const std::string id = install(home.files().script("script", "exec yes"));
    const json over = task(id, "?wait=100");
    EXPECT_EQ(over["state"], "failed");
    EXPECT_NE(over["reason"].get<std::string>().find("more than they may"), std::string::npos);
    EXPECT_EQ(over["details"].value("reason", ""), over["reason"]);
    EXPECT_EQ(over["details"]["commands"][0]["signal"], SIGKILL);
    EXPECT_LT(mostMemory(host->pid()), kMostMemory);
    const std::string next = install(home.files().script("next", "exit 0"));
    EXPECT_EQ(task(next, "?wait=60")["state"], "done") << "the next task may write again";
}

TEST_F(TaskOutput, OfAProcessInASessionOfItsOwnEndsTheTaskLongBeforeItsTimeIsOver) {
    if (!kVforkSharesMemory) GTEST_SKIP() << "the child shares no memory here";
    for (const auto guards : {ManagedHost::Guards::On, ManagedHost::Guards::Off}) {
        host.reset();
        host.emplace(home.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}},
                     std::vector<std::string>{"--max-output", "1000", "--task-timeout", "600"},
                     guards);
        const std::string id = install(home.files().script(
            "script", "setsid sh -c 'echo $$ >\"" + path("pid") + "\"; exec yes' &\nexit 0"));
        const json over = task(id, "?wait=60");
        EXPECT_EQ(over["state"], "failed");
        EXPECT_NE(over["reason"].get<std::string>().find("more than they may"), std::string::npos);
        EXPECT_EQ(over["details"]["commands"][0].value("timed_out", false), false);
        const std::string next = install(home.files().script("next", "exit 0"));
        EXPECT_EQ(task(next, "?wait=60")["state"], "done") << "the next task may write again";
    }
}

TEST_F(TaskOutput, OfAProcessInASessionOfItsOwnThatWritesElsewhereIsNotEnded) {
    start({"--max-output", "1000"});
    const std::string id = install(
        home.files().script("script", "setsid sh -c 'echo $$ >\"" + path("new") + "\"; mv \"" +
                                          path("new") + "\" \"" + path("pid") +
                                          "\"; exec sleep 600' >/dev/null 2>&1 &\n"
                                          "while [ ! -f '" +
                                          path("pid") + "' ]; do sleep 0.05; done\nexec yes"));
    EXPECT_EQ(task(id, "?wait=60")["state"], "failed");
    const pid_t agent = std::stoi(home.files().read("pid"));
    EXPECT_EQ(::kill(agent, SIGKILL), 0) << "it had gone";
}

TEST_F(TaskOutput, BeyondTheLimitEndsEachFurtherCommandToo) {
    start({"--max-output", "1000"});
    home.products({"ux"}, "exit 0");
    home.agentScript("echo $verb >>'" + path("verbs") + "'\nhead -c 2000 /dev/zero | tr '\\0' x");
    const auto reply = post({{"command", "RESTART"}, {"product", "ux"}});
    ASSERT_EQ(reply.status, 202U) << reply.body;
    const json over = task(json::parse(reply.body)["id"], "?wait=60");
    EXPECT_EQ(over["state"], "failed");
    EXPECT_EQ(home.files().read("verbs"), "stop\n");
}

}  // namespace
