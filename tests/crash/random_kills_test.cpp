// Kills the host at random moments while it gets work in both ways, and compares afterwards what
// the journal says with what the tasks themselves wrote down.
//
//   ZAV_CRASH_KILLS=1000 ZAV_CRASH_SEED=17 build/native/bin/crash_threaded_tests
//
// Without these variables it kills three times, with a seed of its own, which is printed.
// ctest-label: threaded

#include <gtest/gtest.h>
#include <signal.h>

#include <cstdlib>
#include <iostream>
#include <map>
#include <nlohmann/json.hpp>
#include <optional>
#include <random>
#include <sstream>
#include <thread>

#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

using nlohmann::json;

unsigned variableOr(const char* name, unsigned otherwise) {
    const char* const value = std::getenv(name);
    return value == nullptr ? otherwise : static_cast<unsigned>(std::strtoul(value, nullptr, 10));
}

class RandomKills : public testing::Test {
protected:
    static constexpr int kTasksPerRound = 5;

    RandomKills() {
        home.products({}, "exit 0");
        // A directory can be made only once, so two tasks at a time are seen.
        const std::string notes = home.files().path("notes");
        const std::string busy = home.files().path("busy");
        home.agentScript("mkdir '" + busy + "' 2>/dev/null || echo overlap $product >>'" + notes +
                         "'\n" + "echo begin $product >>'" + notes + "'\n" + "sleep 0.01\n" +
                         "echo end $product >>'" + notes + "'\n" + "rmdir '" + busy + "'");
        host.emplace(home.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}},
                     std::vector<std::string>{"--max-queued", "1000000"}, ManagedHost::Guards::On);
    }

    /// Status 0 when the host died before it answered.
    RawClient::Answer post(const std::string& path, const json& body) const {
        RawClient client(host->socket());
        if (!client.connected()) return {};
        return client.post(path, body.dump());
    }
    /// Whether the host says that it has accepted a task of this name; nothing: it said nothing.
    std::optional<bool> askInTurn(const std::string& name) const {
        const auto reply =
            post("/v1/tasks",
                 {{"command", "START"}, {"product", name}, {"transid", name}, {"force", true}});
        if (reply.status == 0) return std::nullopt;
        EXPECT_EQ(reply.status, 202U) << reply.body;
        return reply.status == 202;
    }
    std::optional<bool> askOnTheTable(const std::string& name) const {
        json where = json::array();
        for (const auto& [column, value] : std::map<std::string, std::string>{
                 {"COMMAND", "START"}, {"PRODUCT", name}, {"TRANSID", name}}) {
            where.push_back({{"column", column}, {"op", "="}, {"value", value}});
        }
        const auto reply =
            post("/v1/query", {{"table", "KAGREQT"}, {"where", where}, {"force", true}});
        if (reply.status == 0) return std::nullopt;
        // What the killed host was doing may not have ended yet.
        EXPECT_TRUE(reply.status == 200 || reply.status == 503) << reply.body;
        return reply.status == 200;
    }
    /// Asks for tasks until there are enough or the host is dead. Names are letter and number.
    void load(char letter, int first, std::vector<std::string>& names) const {
        for (int i = 0; i < kTasksPerRound; ++i) {
            const std::string name = letter + std::to_string(first + i);
            const auto answer = letter == 'j' ? askInTurn(name) : askOnTheTable(name);
            if (!answer) return;
            if (*answer) names.push_back(name);
        }
    }
    /// Loads the host in both ways and kills it after this time.
    void loadAndKill(int round, std::chrono::microseconds delay) {
        std::vector<std::string> inTurn;
        std::vector<std::string> onTheTable;
        const int first = round * kTasksPerRound;
        std::thread one([&] { load('j', first, inTurn); });
        std::thread other([&] { load('q', first, onTheTable); });
        std::this_thread::sleep_for(delay);
        host->program().signal(SIGKILL);
        one.join();
        other.join();
        EXPECT_EQ(host->program().wait().status, 128 + SIGKILL);
        accepted.insert(accepted.end(), inTurn.begin(), inTurn.end());
        accepted.insert(accepted.end(), onTheTable.begin(), onTheTable.end());
        host->start();
    }

    json get(const std::string& path) const {
        RawClient client(host->socket());
        return json::parse(client.get(path).body);
    }
    bool isIdle() const {
        return get("/v1/tasks?state=queued")["tasks"].empty() &&
               get("/v1/tasks?state=running")["tasks"].empty();
    }
    /// All tasks, by name.
    std::map<std::string, json> allTasks() const {
        std::map<std::string, json> tasks;
        std::string after;
        for (;;) {
            const json page = get("/v1/tasks?limit=1000" + after);
            for (const json& task : page["tasks"]) {
                const std::string name = task["transid"];
                EXPECT_EQ(tasks.count(name), 0U) << name << " was accepted once";
                tasks[name] = task;
            }
            if (page["next"].is_null()) return tasks;
            after = "&after=" + page["next"].dump();
        }
    }
    std::vector<std::pair<std::string, std::string>> notes() const {
        std::istringstream text(home.files().read("notes"));
        std::vector<std::pair<std::string, std::string>> lines;
        for (std::string what, name; text >> what >> name;)
            lines.emplace_back(what, name);
        return lines;
    }

    ScriptHome home;
    std::optional<ManagedHost> host;
    std::vector<std::string> accepted;
};

TEST_F(RandomKills, LoseNothingAndRepeatNothing) {
    const unsigned kills = variableOr("ZAV_CRASH_KILLS", 3);
    const unsigned seed = variableOr("ZAV_CRASH_SEED", std::random_device()());
    std::cout << kills << " kills with the seed " << seed << std::endl;
    std::mt19937 random(seed);
    std::uniform_int_distribution<int> delays(0, 300'000);
    for (unsigned round = 0; round < kills; ++round)
        loadAndKill(static_cast<int>(round), std::chrono::microseconds(delays(random)));
    ASSERT_TRUE(eventually([this] { return isIdle(); }, std::chrono::minutes(1 + kills)));

    std::map<std::string, int> begun;
    std::map<std::string, int> ended;
    std::vector<std::string> order;
    for (const auto& [what, name] : notes()) {
        EXPECT_NE(what, "overlap") << name;
        if (what == "begin") {
            ++begun[name];
            order.push_back(name);
        } else if (what == "end") {
            ++ended[name];
        }
    }
    const std::map<std::string, json> tasks = allTasks();
    for (const std::string& name : accepted)
        EXPECT_EQ(tasks.count(name), 1U) << name << " was accepted and is missing";
    for (const auto& [name, task] : tasks) {
        const std::string state = task["state"];
        if (state == "done") {
            EXPECT_EQ(begun[name], 1) << name;
            EXPECT_EQ(ended[name], 1) << name;
        } else {
            EXPECT_EQ(state, "interrupted") << name;
            EXPECT_LE(begun[name], 1) << name;
        }
    }
    for (const std::string& name : order)
        EXPECT_EQ(tasks.count(name), 1U) << name << " ran without being known";
    int last = -1;
    for (const std::string& name : order) {
        if (name.front() != 'j') continue;
        const int number = std::stoi(name.substr(1));
        EXPECT_LT(last, number) << "the order of acceptance";
        last = number;
    }
}

}  // namespace
