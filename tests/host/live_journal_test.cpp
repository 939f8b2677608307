// The journal of a running host, read by other programs.
// ctest-label: threaded
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <nlohmann/json.hpp>
#include <optional>

#include "host/journal/database.h"
#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

using nlohmann::json;

class LiveJournal : public testing::Test {
protected:
    LiveJournal() {
        home.products({"ux"}, "exit 0");
        home.agentScript("until [ -e '" + home.files().path("gate") + "' ]; do sleep 0.02; done");
        host.emplace(home.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}},
                     std::vector<std::string>{}, ManagedHost::Guards::On);
    }
    std::string accept() const {
        RawClient client(host->socket());
        const auto reply = client.post("/v1/tasks", R"({"command": "START", "product": "ux"})");
        EXPECT_EQ(reply.status, 202U) << reply.body;
        return json::parse(reply.body)["id"];
    }
    /// Opens the journal in a process of its own, which ends then; returns how many tasks it saw.
    int tasksThatAnotherProgramSees() const {
        const pid_t program = ::fork();
        if (program == 0) {
            int seen = -1;
            try {
                host::Database journal(home.path() + "/zavhost/journal.db");
                seen = static_cast<int>(journal.number("SELECT count(*) FROM tasks"));
            } catch (const std::exception&) {
                // The status says so.
            }
            ::_exit(seen);
        }
        int status = 0;
        EXPECT_EQ(::waitpid(program, &status, 0), program);
        return WEXITSTATUS(status);
    }

    ScriptHome home;
    std::optional<ManagedHost> host;
};

TEST_F(LiveJournal, LosesNothingWhenAnotherProgramHasReadIt) {
    accept();
    const std::string second = accept();
    EXPECT_EQ(tasksThatAnotherProgramSees(), 2);
    const std::string third = accept();
    host->program().signal(SIGKILL);
    EXPECT_EQ(host->program().wait().status, 128 + SIGKILL);
    home.files().write("gate", "");
    host->start();
    for (const std::string& id : {second, third}) {
        RawClient client(host->socket());
        const json task = json::parse(client.get("/v1/tasks/" + id + "?wait=60").body);
        EXPECT_EQ(task["state"], "done") << task;
    }
}

}  // namespace
