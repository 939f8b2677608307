// What the host tells of a task: how its commands really ended and what they wrote.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <pwd.h>
#include <signal.h>
#include <unistd.h>

#include <algorithm>
#include <nlohmann/json.hpp>

#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"
#include "support/process/left_running.h"
#include "support/process/vfork.h"

namespace {

using nlohmann::json;
using Guards = ManagedHost::Guards;

class TaskDetails : public testing::Test {
protected:
    TaskDetails() { home.products({"ux"}, "exit 0"); }

    void start(Guards guards) {
        host.emplace(home.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}},
                     std::vector<std::string>{}, guards);
    }
    json get(const std::string& path) const {
        RawClient client(host->socket());
        return json::parse(client.get(path).body);
    }
    /// Queues a command and does not wait for it.
    void queue(std::vector<std::string> arguments, const std::string& transid) const {
        const auto dashes = std::find(arguments.begin(), arguments.end(), "--");
        arguments.insert(dashes, {"--no-wait", "--transid", transid});
        const ProgramResult result = host->zavctl(arguments);
        ASSERT_EQ(result.status, 0) << result.err;
    }
    /// The task once it is over.
    json over(const std::string& name) const { return get("/v1/tasks/" + name + "?wait=60"); }
    json onlyCommand(const json& task) const {
        const json& commands = task.at("details").at("commands");
        EXPECT_EQ(commands.size(), 1U) << task;
        return commands.empty() ? json() : commands[0];
    }

    ScriptHome home;
    std::optional<ManagedHost> host;
};

TEST_F(TaskDetails, TellWhyATaskFailed) {
    home.products({"ux"}, "exit 0");
    home.agentScript("echo I will; echo I cannot >&2; exit 3");
    start(Guards::On);
    queue({"start", "ux"}, "T-1");
    const json task = over("T-1");
    EXPECT_EQ(task["state"], "failed");
    EXPECT_EQ(task["transid"], "T-1");
    EXPECT_EQ(task["command"], "START");
    EXPECT_EQ(task["product"], "ux");
    EXPECT_EQ(task["asker"], ::getpwuid(::getuid())->pw_name);
    EXPECT_EQ(task["reply"]["RETVAL"], 0);
    EXPECT_EQ(task["events"].at(0)["RETVAL"], 1024);
    const json command = onlyCommand(task);
    EXPECT_EQ(command["command"],
              home.path() + "/bin/TovrinAgent  -h " + home.path() + " start ux");
    EXPECT_EQ(command["exit"], 3);
    EXPECT_EQ(command["stdout"], "I will\n");
    EXPECT_EQ(command["stderr"], "I cannot\n");
    EXPECT_GT(command["pid"], 0);
    EXPECT_FALSE(command.contains("signal"));
    EXPECT_FALSE(command.contains("error"));
    const char* const time = "20..-..-..T..:..:..\\....Z";
    for (const json& at :
         {task["accepted"], task["started"], task["ended"], command["started"], command["ended"]})
        EXPECT_THAT(at.get<std::string>(), testing::MatchesRegex(time));
    EXPECT_LE(task["accepted"], task["started"]);
    EXPECT_LE(task["started"], task["ended"]);
}

TEST_F(TaskDetails, ASuccessWhoseCommandWasKilledIsAFailure) {
    home.products({"ux"}, "exit 0");
    home.agentScript("kill -9 $$");
    start(Guards::On);
    queue({"start", "ux"}, "T-1");
    const json task = over("T-1");
    EXPECT_EQ(task["events"].at(0)["RETVAL"], 0) << "the row stays as it is";
    EXPECT_EQ(task["state"], "failed");
    EXPECT_EQ(onlyCommand(task)["signal"], SIGKILL);
}

TEST_F(TaskDetails, WithoutGuardsItIsASuccessAsThePluginSays) {
    home.agentScript("kill -9 $$");
    start(Guards::Off);
    queue({"start", "ux"}, "T-1");
    const json task = over("T-1");
    EXPECT_EQ(task["events"].at(0)["RETVAL"], 0);
    EXPECT_EQ(task["state"], "done");
    EXPECT_EQ(onlyCommand(task)["signal"], SIGKILL);
}

TEST_F(TaskDetails, ASuccessThatExecutedNothingIsAFailure) {
    if (!kVforkSharesMemory) GTEST_SKIP() << "the child shares no memory here";
    const std::string script =
        home.files().write("depot/install.sh", "#!/no/such/interpreter\n", 0755);
    start(Guards::On);
    queue({"install", "ux", "060100", "--", script}, "T-1");
    const json task = over("T-1");
    EXPECT_EQ(task["events"].at(0)["RETVAL"], 0);
    EXPECT_EQ(task["state"], "failed");
    EXPECT_EQ(onlyCommand(task)["error"], "cannot be executed: No such file or directory");
}

TEST_F(TaskDetails, WithoutGuardsThatIsASuccessToo) {
    const std::string script =
        home.files().write("depot/install.sh", "#!/no/such/interpreter\n", 0755);
    start(Guards::Off);
    queue({"install", "ux", "060100", "--", script}, "T-1");
    const json task = over("T-1");
    EXPECT_EQ(task["events"].at(0)["RETVAL"], 0);
    EXPECT_EQ(task["state"], "done");
}

TEST_F(TaskDetails, ShowTheProcessesOfTheTaskAtWork) {
    home.agentScript("echo begun\n" + untilReleased(home.files().path("go")));
    const std::string install = home.files().script(
        "depot/install.sh", "echo begun\n" + untilReleased(home.files().path("go")));
    start(Guards::On);
    queue({"install", "ux", "060100", "--", install}, "T-1");
    queue({"start", "ux"}, "T-2");
    json running;
    EXPECT_TRUE(eventually([&] {
        running = get("/v1/tasks/T-1");
        const json& commands = running["details"]["commands"];
        return commands.size() == 1 && commands[0]["stdout"] == "begun\n";
    })) << running;
    EXPECT_EQ(running["state"], "running");
    EXPECT_EQ(running["ended"], nullptr);
    const json command = onlyCommand(running);
    EXPECT_EQ(command["ended"], nullptr);
    if (kVforkSharesMemory) {
        EXPECT_EQ(::kill(command["pid"].get<pid_t>(), 0), 0);
    }
    EXPECT_EQ(get("/v1/tasks/T-2")["state"], "queued");
    const json list = get("/v1/tasks?state=running");
    ASSERT_EQ(list["tasks"].size(), 1U);
    EXPECT_EQ(list["tasks"][0]["transid"], "T-1");
    EXPECT_EQ(list["next"], nullptr);
    EXPECT_EQ(get("/v1/tasks/T-2?wait=1")["state"], "queued") << "the time was over first";
    home.files().write("go", "");
    EXPECT_EQ(over("T-2")["state"], "done");
    EXPECT_EQ(get("/v1/tasks/T-1")["state"], "done");
}

TEST_F(TaskDetails, TheOutputOfAnInstallThatMayRestartTheHostIsTakenFromTheDepot) {
    const std::string go = home.files().path("go");
    const std::string install =
        home.files().script("depot/install.sh", "echo installing; echo careful >&2\n" +
                                                    untilReleased(go) + "echo installed; exit 4");
    start(Guards::On);
    queue({"install", "ux", "060100", "--restart", "--", install}, "T-1");
    json task;
    EXPECT_TRUE(eventually([&] {
        task = get("/v1/tasks/T-1");
        const json& commands = task["details"]["commands"];
        return task["events"].size() == 1 && !commands.empty() &&
               commands.back()["stdout"] == "installing\n";
    })) << task;
    EXPECT_EQ(task["events"][0]["RETVAL"], 0);
    EXPECT_EQ(task["state"], "running") << "begun, not done";
    home.files().write("go", "");
    task = over("T-1");
    EXPECT_EQ(task["state"], "failed");
    EXPECT_EQ(task["events"].size(), 2U);
    const json command = task["details"]["commands"].back();
    EXPECT_EQ(command["exit"], 4);
    EXPECT_EQ(command["stdout"], "installing\ninstalled\n");
    EXPECT_EQ(command["stderr"], "careful\n");
}

TEST_F(TaskDetails, TheEndOfALongOutputIsKept) {
    home.products({"ux"}, "exit 0");
    home.agentScript("i=0; while [ $i -lt 2000 ]; do echo line $i; i=$((i+1)); done; exit 1");
    start(Guards::On);
    queue({"start", "ux"}, "T-1");
    const std::string out = onlyCommand(over("T-1"))["stdout"];
    EXPECT_EQ(out.size(), 4096U);
}

TEST_F(TaskDetails, AConfigurationIsInNone) {
    home.products({"ux"}, "case $* in *-g*) echo INSTANCE=x; echo PASSWORD=secret1 ;; esac");
    start(Guards::On);
    queue({"config", "set", "ux", "INSTANCE=x PASSWORD=secret2"}, "T-1");
    EXPECT_EQ(over("T-1")["state"], "done");
    EXPECT_EQ(host->zavctl({"config", "get", "ux"}).status, 0);
    const json read = get("/v1/tasks?command=GETCONFIG")["tasks"].at(0);
    for (const std::string& name : {std::string("T-1"), read["id"].get<std::string>()}) {
        const std::string text = get("/v1/tasks/" + name).dump();
        EXPECT_EQ(text.find("secret"), std::string::npos) << text;
    }
}

TEST_F(TaskDetails, ARefusedRequestIsATaskToo) {
    start(Guards::Off);
    RawClient client(host->socket());
    client.post("/v1/query", R"({"table":"KAGREQT","where":[)"
                             R"({"column":"COMMAND","op":"=","value":"START"},)"
                             R"({"column":"TRANSID","op":"=","value":"T/1 x"}]})");
    const json task = get("/v1/tasks/T%2F1%20x");
    EXPECT_EQ(task["state"], "refused");
    EXPECT_NE(task["reply"]["RETVAL"], 0);
    EXPECT_EQ(task["started"], nullptr);
    EXPECT_TRUE(task["events"].empty());
}

TEST_F(TaskDetails, WhatIsNotThereIsSaid) {
    start(Guards::On);
    EXPECT_EQ(get("/v1/tasks/none")["error"], "there is no task \"none\"");
    EXPECT_EQ(get("/v1/tasks/none?wait=60")["error"], "there is no task \"none\"");
    EXPECT_EQ(get("/v1/tasks?state=dead")["error"],
              "there is no state \"dead\" but queued, running, done, failed, refused, "
              "cancelled, expired, interrupted");
}

}  // namespace
