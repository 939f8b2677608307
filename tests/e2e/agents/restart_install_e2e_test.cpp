// Installs that stop the process that runs them: the early outcome, the host's return, and the real
// outcome fetched afterwards.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <signal.h>
#include <unistd.h>

#include <map>
#include <nlohmann/json.hpp>
#include <optional>
#include <sstream>

#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

using nlohmann::json;

/// A home with a depot of its own and a translator that notes its calls.
class RestartInstallTest : public testing::Test {
protected:
    RestartInstallTest() {
        files().script("home/bin/cinfo",
                       "echo '\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"'\n"
                       "echo '\"ax\",\"Shared\",\"lx8266\",\"010000000\",\"100\"'\n");
        files().script("home/agtqvs6/lx8266/bin/zav_xa",
                       "echo \"$@\" >>'" + files().path("translator") + "'\n");
        files().makeDir("home/depot");
    }

    const ScratchDir& files() const { return home_.files(); }
    std::string depot() const { return home_.path() + "/depot/"; }

    std::unique_ptr<ManagedHost> startHost() const {
        return std::make_unique<ManagedHost>(
            home_.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home_.path() + "/depot"}});
    }

    /// An installer that waits for letItRun(), kills the host then and ends with `code`.
    std::string installer(const std::string& name, const ManagedHost& host, int code) const {
        return files().script(name, "until [ -e '" + files().path("go") +
                                        "' ]; do sleep 0.05; done\nkill -9 " +
                                        std::to_string(host.pid()) +
                                        "\nsleep 1\necho installed\necho trouble >&2\nexit " +
                                        std::to_string(code) + "\n");
    }

    /// The host is to be killed when it has told of the first outcome, not before.
    void letItRun() const { files().write("go", ""); }

    /// Sends the install, waits for its first outcome and for the host to be killed by it.
    void installAndAwaitDeath(ManagedHost& host, const std::string& command) const {
        const ProgramResult result = host.zavctl(
            {"--json", "install", "UX", "010000000", "--restart", "--", "/bin/sh", command});
        ASSERT_EQ(result.status, 0) << result.out << result.err;
        const json document = json::parse(result.out);
        EXPECT_EQ(document["reply"]["RETVAL"], 0);
        ASSERT_EQ(document["events"].size(), 1U);
        EXPECT_EQ(document["events"][0]["RETVAL"], 0) << "success is reported before it has run";
        letItRun();
        EXPECT_EQ(host.program().wait(std::chrono::seconds(30)).status, 128 + SIGKILL);
    }

    ScriptHome home_;
};

TEST_F(RestartInstallTest, TheRealOutcomeIsFetchedFromTheHostThatCameBack) {
    const auto host = startHost();
    files().write("home/depot/ux/left", "");
    installAndAwaitDeath(*host, installer("installer", *host, 0));
    host->start();
    const ProgramResult result = host->zavctl({"--json", "complete-install"});
    EXPECT_EQ(result.status, 0) << result.out << result.err;
    const json row = json::parse(result.out);
    EXPECT_EQ(row["RETVAL"], 0);
    EXPECT_EQ(row["RETMSGID"], "");
    EXPECT_EQ(files().read("home/depot/rc.txt"), "0\n");
    EXPECT_EQ(files().read("home/depot/stdout.txt"), "installed\n");
    EXPECT_EQ(files().read("home/depot/stderr.txt"), "trouble\n");
    EXPECT_EQ(files().read("translator"), "-setCMS UX\n");
    EXPECT_FALSE(files().exists("home/depot/ux")) << "the product's folder is cleaned away";
}

TEST_F(RestartInstallTest, CompleteFollowsAFailingInstallToItsEndByItself) {
    const auto host = startHost();
    const std::string command = installer("installer", *host, 65);
    Program waiting({zavctlPath(), "--socket", host->socket(), "install", "ux", "010000000",
                     "--restart", "--complete", "--transid", "it", "--", "/bin/sh", command});
    ASSERT_TRUE(waiting.awaitOutput("install ux (it): begun\n", std::chrono::seconds(40)));
    letItRun();
    EXPECT_EQ(host->program().wait(std::chrono::seconds(40)).status, 128 + SIGKILL);
    host->start();
    const ProgramResult result = waiting.wait(std::chrono::seconds(60));
    EXPECT_EQ(result.status, 1) << result.err;
    EXPECT_THAT(result.out, testing::StartsWith("install ux (it): accepted\n"
                                                "install ux (it): begun\n"
                                                "install ux (it): failed after "));
    EXPECT_THAT(result.out, testing::HasSubstr("ZAV1031E"));
    EXPECT_THAT(result.out, testing::HasSubstr(depot() + "rc.txt,65"));
    EXPECT_FALSE(files().exists("translator"));
}

TEST_F(RestartInstallTest, WithoutATranslatorNothingIsRun) {
    const auto host = startHost();
    ASSERT_EQ(::unlink((home_.path() + "/agtqvs6/lx8266/bin/zav_xa").c_str()), 0);
    const ProgramResult result = host->zavctl({"--json", "install", "ux", "010000000", "--restart",
                                               "--", "/bin/touch", files().path("ran")});
    EXPECT_EQ(result.status, 1);
    const json event = json::parse(result.out)["events"][0];
    EXPECT_EQ(event["RETVAL"], 1031);
    EXPECT_EQ(event["RETMSGID"], "ZAV1030E");
    EXPECT_EQ(event["RETMSGPARM"], "/bin/touch " + files().path("ran"));
    EXPECT_FALSE(files().exists("ran"));
    EXPECT_FALSE(files().exists("home/depot/runcmd.sh"));
}

// ---- Tasks of the journal
// --------------------------------------------------------------------------

/// An install as a task of a guarded host, in a depot that still has the result of an earlier one.
class RestartInstallTask : public RestartInstallTest {
protected:
    RestartInstallTask() {
        home_.products({"ux"}, "echo \"$@\" >>'" + files().path("translator") + "'");
        files().write("home/depot/rc.txt", "0\n");
        home_.agentScript("exit 0");
    }

    void start(const std::vector<std::string>& arguments = {},
               ManagedHost::Guards guards = ManagedHost::Guards::On) {
        host.emplace(home_.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home_.path() + "/depot"}},
                     arguments, guards);
    }
    /// The status of a request on the table that asks for a start.
    int startOnTheTable() const {
        json where = json::array();
        for (const auto& [column, value] : std::map<std::string, std::string>{
                 {"COMMAND", "START"}, {"PRODUCT", "ux"}, {"TRANSID", "t"}}) {
            where.push_back({{"column", column}, {"op", "="}, {"value", value}});
        }
        RawClient client(host->socket());
        return client.post("/v1/query", json{{"table", "KAGREQT"}, {"where", where}}.dump()).status;
    }
    std::string post(const json& body, int status) const {
        RawClient client(host->socket());
        const auto reply = client.post("/v1/tasks", body.dump());
        EXPECT_EQ(reply.status, status) << reply.body;
        return json::parse(reply.body)["id"];
    }
    /// An install that runs this script; returns when it has begun.
    std::string begin(const std::string& script) const {
        const std::string id = post({{"command", "INSTALL"},
                                     {"product", "ux"},
                                     {"version", "010000000"},
                                     {"optional", "REQUIRES_RESTART"},
                                     {"context", "/bin/sh " + script}},
                                    202);
        EXPECT_TRUE(eventually([&] { return files().exists("begun"); }));
        return id;
    }
    json get(const std::string& target) const {
        RawClient client(host->socket());
        return json::parse(client.get(target).body);
    }
    json task(const std::string& id) const { return get("/v1/tasks/" + id); }
    bool awaitState(const std::string& id, const std::string& state) const {
        return eventually([&] { return task(id)["state"] == state; }, std::chrono::seconds(60));
    }
    void killHost() {
        host->program().signal(SIGKILL);
        EXPECT_EQ(host->program().wait().status, 128 + SIGKILL);
    }
    std::string untilGo() const {
        return "echo >'" + files().path("begun") + "'\nuntil [ -e '" + files().path("go") +
               "' ]; do sleep 0.05; done\n";
    }

    std::optional<ManagedHost> host;
};

TEST_F(RestartInstallTask, EndsAsItsScriptDidWhileTheHostWasAway) {
    start();
    const std::string id = begin(files().script("installer", untilGo() + "exit 9"));
    EXPECT_EQ(task(id)["state"], "running");
    EXPECT_EQ(task(id)["events"].size(), 1U) << "it has begun";
    killHost();
    host->start();
    const std::string next = post({{"command", "START"}, {"product", "ux"}}, 202);
    EXPECT_EQ(task(id)["state"], "running") << "it goes on";
    EXPECT_EQ(task(next)["state"], "queued");
    EXPECT_EQ(get("/v1/ready")["ready"], false);
    EXPECT_EQ(startOnTheTable(), 503);
    letItRun();
    ASSERT_TRUE(awaitState(id, "failed")) << task(id);
    EXPECT_NE(task(id)["reason"].get<std::string>().find("rc.txt,9"), std::string::npos)
        << task(id);
    EXPECT_TRUE(awaitState(next, "done"));
    EXPECT_EQ(get("/v1/ready")["ready"], true);
}

TEST_F(RestartInstallTask, IsInterruptedWhenNothingOfItLivesAndItLeftNoResult) {
    start();
    const std::string id = begin(
        files().script("installer", "echo $$ $PPID >'" + files().path("pids") + "'\n" + untilGo()));
    killHost();
    std::istringstream pids(files().read("pids"));
    for (pid_t pid = 0; pids >> pid;)
        ::kill(pid, SIGKILL);
    host->start();
    ASSERT_TRUE(awaitState(id, "interrupted")) << task(id);
    EXPECT_FALSE(files().exists("home/depot/rc.txt")) << "the earlier one is gone";
}

TEST_F(RestartInstallTask, WithoutGuardsTheOldResultStays) {
    start({}, ManagedHost::Guards::Off);
    json where = json::array();
    for (const auto& [column, value] :
         std::map<std::string, std::string>{{"COMMAND", "INSTALL"},
                                            {"PRODUCT", "ux"},
                                            {"VERSION", "010000000"},
                                            {"OPTIONAL", "REQUIRES_RESTART"},
                                            {"CONTEXT", "/bin/true"},
                                            {"TRANSID", "t"}}) {
        where.push_back({{"column", column}, {"op", "="}, {"value", value}});
    }
    RawClient client(host->socket());
    EXPECT_EQ(client.post("/v1/query", json{{"table", "KAGREQT"}, {"where", where}}.dump()).status,
              200);
    EXPECT_EQ(files().read("home/depot/rc.txt"), "0\n")
        << "the plug-in takes a while before its script removes it";
    EXPECT_TRUE(awaitState("t", "done"));
}

TEST_F(RestartInstallTask, WithoutGuardsARequestIsQueuedBesideIt) {
    start({}, ManagedHost::Guards::Off);
    const std::string id = begin(files().script("installer", untilGo()));
    killHost();
    host->start();
    EXPECT_EQ(startOnTheTable(), 200);
    letItRun();
    EXPECT_TRUE(awaitState(id, "done")) << task(id);
}

TEST_F(RestartInstallTask, DoesNotHoldUpTheHostsEndAndIsCompletedAfterwards) {
    start({"--grace", "3600"});
    // It waits for the host's end, as one that replaces the host does.
    const std::string id =
        begin(files().script("installer", "echo >'" + files().path("begun") + "'\nwhile kill -0 " +
                                              std::to_string(host->pid()) +
                                              " 2>/dev/null; do sleep 0.05; done\nexit 0"));
    host->program().signal(SIGTERM);
    const ProgramResult result = host->program().wait(std::chrono::seconds(30));
    EXPECT_EQ(result.status, 0) << result.err;
    host->start();
    EXPECT_TRUE(awaitState(id, "done")) << task(id);
}

}  // namespace
