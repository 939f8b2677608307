// What becomes of the processes of a command whose time is over, and of those that outlive theirs.
// ctest-label: threaded

#include <gtest/gtest.h>
#include <signal.h>

#include <fstream>
#include <nlohmann/json.hpp>
#include <optional>
#include <set>

#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

using nlohmann::json;
using Guards = ManagedHost::Guards;

bool lives(pid_t pid) {
    std::ifstream in("/proc/" + std::to_string(pid) + "/stat");
    std::string text;
    std::getline(in, text);
    const std::size_t end = text.rfind(')');
    return end != std::string::npos && text.compare(end + 2, 1, "Z") != 0;
}

class TimeOut : public testing::Test {
protected:
    TimeOut() { home.products({"ux"}, "exit 0"); }
    ~TimeOut() override {
        for (const char* const name : {"child", "orphan", "agent"}) {
            if (home.files().exists(name)) ::kill(pidIn(name), SIGKILL);
        }
    }

    void start(Guards guards, const std::vector<std::string>& arguments = {}) {
        host.emplace(home.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}}, arguments,
                     guards);
    }
    pid_t pidIn(const std::string& name) const { return std::stoi(home.files().read(name)); }
    bool lives(const std::string& name) const { return ::lives(pidIn(name)); }
    std::string file(const std::string& name) const { return home.files().path(name); }

    /// TovrinAgent starts a child, an orphan and an agent with a session of its own, and never
    /// ends.
    void hangWithProcesses() {
        const std::string quiet = " >/dev/null 2>&1 </dev/null & ";
        home.agentScript("sleep 1000" + quiet + "echo $! >" + file("child") + "; (sleep 1000" +
                         quiet + "echo $! >" + file("orphan") + "); setsid sh -c 'echo $$ >" +
                         file("agent") + "; exec sleep 1000'" + quiet + "exec sleep 1000");
    }

    ScriptHome home;
    std::optional<ManagedHost> host;
};

TEST_F(TimeOut, EndsWhatTheCommandStartedButNotAgents) {
    hangWithProcesses();
    start(Guards::On, {"--task-timeout", "5"});
    EXPECT_EQ(host->zavctl({"start", "ux"}).status, 1);
    EXPECT_TRUE(eventually([&] { return !lives("child") && !lives("orphan"); }));
    EXPECT_TRUE(lives("agent"));
}

TEST_F(TimeOut, WithoutGuardsTheyLiveOn) {
    hangWithProcesses();
    start(Guards::Off, {"--task-timeout", "5"});
    EXPECT_EQ(host->zavctl({"start", "ux"}).status, 1);
    for (const char* const name : {"child", "orphan", "agent"})
        EXPECT_TRUE(lives(name)) << name;
}

TEST_F(TimeOut, NoExitCodeIsLostWhileHundredsOfOrphansAreReaped) {
    home.agentScript(
        "for i in 1 2 3 4 5 6 7 8 9; do for j in 1 2 3; do\n"
        "    (sleep 0.$j$i >/dev/null 2>&1 </dev/null &)\n"
        "done; done\n"
        "exit 3");
    start(Guards::On);
    constexpr int kTasks = 12;
    std::set<std::string> transids;
    for (int i = 0; i < kTasks; ++i) {
        const std::string transid = "T-" + std::to_string(i);
        transids.insert(transid);
        RawClient client(host->socket());
        const auto answer =
            client.post("/v1/query", R"({"table":"KAGREQT","where":[)"
                                     R"({"column":"COMMAND","op":"=","value":"START"},)"
                                     R"({"column":"PRODUCT","op":"=","value":"ux"},)"
                                     R"({"column":"TRANSID","op":"=","value":")" +
                                         transid + "\"}]}");
        ASSERT_EQ(answer.status, 200) << answer.body;
        // The inventory program runs on another thread meanwhile.
        const auto rows = client.post("/v1/query", R"({"table":"KINAGT"})");
        EXPECT_NE(rows.body.find("\"ux\""), std::string::npos) << rows.body;
    }
    for (const std::string& transid : transids) {
        RawClient client(host->socket());
        const json task = json::parse(client.get("/v1/tasks/" + transid + "?wait=60").body);
        EXPECT_EQ(task.at("events").at(0).at("RETVAL"), 1024) << task;
        EXPECT_EQ(task.at("details").at("commands").at(0).at("exit"), 3) << task;
    }
    EXPECT_TRUE(eventually([&] { return host->children() == 0; })) << "all orphans are reaped";
}

}  // namespace
