/// A host that is killed while it gets work in both ways, and what its tasks wrote down themselves.
#pragma once

#include <gtest/gtest.h>
#include <signal.h>

#include <chrono>
#include <map>
#include <nlohmann/json.hpp>
#include <optional>
#include <sstream>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"

class KilledHost : public testing::Test {
protected:
    using json = nlohmann::json;

    static constexpr int kTasksPerRound = 5;
    /// The products of tasks with smaller numbers are installed.
    static constexpr int kInstalled = 60;

    explicit KilledHost(const Environment& environment = {},
                        const std::vector<std::string>& moreArguments = {}) {
        std::vector<std::string> products;
        for (int i = 0; i < kInstalled; ++i)
            products.push_back("j" + std::to_string(i));
        home.products(products, "exit 0");
        // A directory can be made only once, so two tasks at a time are seen.
        const std::string notes = home.files().path("notes");
        const std::string busy = home.files().path("busy");
        home.agentScript("mkdir '" + busy + "' 2>/dev/null || echo overlap $product >>'" + notes +
                         "'\n" + "echo begin $product >>'" + notes + "'\n" + "sleep 0.01\n" +
                         "echo end $product >>'" + notes + "'\n" + "rmdir '" + busy + "'");
        Environment whole = environment;
        whole.emplace_back("QVSDEPLOY_AGENTDEPOT", home.depot());
        std::vector<std::string> arguments = {"--max-queued", "1000000"};
        arguments.insert(arguments.end(), moreArguments.begin(), moreArguments.end());
        host.emplace(home.path(), whole, arguments, ManagedHost::Guards::On);
    }

    /// Status 0 when the host died before it answered.
    RawClient::Answer post(const std::string& path, const json& body) const {
        RawClient client(host->socket());
        if (!client.connected()) return {};
        return client.post(path, body.dump());
    }
    /// Whether the host says that it has accepted a task of this name; nothing: it said nothing.
    std::optional<bool> askInTurn(const std::string& name) const {
        // Every other one is looked at by the guards, which takes a while, before it is handed
        // over.
        const int number = std::stoi(name.substr(1));
        const bool isForced = number >= kInstalled || number % 2 == 0;
        const auto reply =
            post("/v1/tasks",
                 {{"command", "START"}, {"product", name}, {"transid", name}, {"force", isForced}});
        if (reply.status == 0) return std::nullopt;
        // Its disk may be full.
        EXPECT_TRUE(reply.status == 202 || (mayBeFull && reply.status == 503)) << reply.body;
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
    /// The names of tasks by what the host said.
    struct Asked {
        std::vector<std::string> accepted;
        std::vector<std::string> refused;
    };
    /// Asks for tasks until there are enough or the host is dead. Names are letter and number.
    void load(char letter, int first, Asked& asked) const {
        for (int i = 0; i < kTasksPerRound; ++i) {
            const std::string name = letter + std::to_string(first + i);
            const auto answer = letter == 'j' ? askInTurn(name) : askOnTheTable(name);
            if (!answer) return;
            (*answer ? asked.accepted : asked.refused).push_back(name);
        }
    }
    /// Loads the host in both ways and does this to it after a time.
    template <typename Disturb>
    void loadAndDisturb(int round, std::chrono::microseconds delay, Disturb disturb) {
        Asked inTurn;
        Asked onTheTable;
        const int first = round * kTasksPerRound;
        std::thread one([&] { load('j', first, inTurn); });
        std::thread other([&] { load('q', first, onTheTable); });
        std::this_thread::sleep_for(delay);
        disturb();
        one.join();
        other.join();
        for (const Asked* const asked : {&inTurn, &onTheTable}) {
            accepted.insert(accepted.end(), asked->accepted.begin(), asked->accepted.end());
            refused.insert(refused.end(), asked->refused.begin(), asked->refused.end());
        }
    }
    void loadAndKill(int round, std::chrono::microseconds delay) {
        loadAndDisturb(round, delay, [this] { host->program().signal(SIGKILL); });
        EXPECT_EQ(host->program().wait().status, 128 + SIGKILL);
        host->start();
    }
    /// Its commands go on while it is stopped.
    void loadAndStop(int round, std::chrono::microseconds delay, std::chrono::microseconds pause) {
        loadAndDisturb(round, delay, [this, pause] {
            host->program().signal(SIGSTOP);
            std::this_thread::sleep_for(pause);
            host->program().signal(SIGCONT);
        });
    }

    json get(const std::string& path) const {
        RawClient client(host->socket());
        return json::parse(client.get(path).body);
    }
    bool isIdle() const {
        return get("/v1/tasks?state=queued")["tasks"].empty() &&
               get("/v1/tasks?state=running")["tasks"].empty();
    }
    /// All tasks, by name. Names that were given twice are faults.
    std::map<std::string, json> allTasks(std::vector<std::string>& faults) const {
        std::map<std::string, json> tasks;
        std::string after;
        for (;;) {
            const json page = get("/v1/tasks?limit=1000" + after);
            for (const json& task : page["tasks"]) {
                const std::string name = task["transid"];
                if (!tasks.emplace(name, task).second) faults.push_back(name + " is there twice");
            }
            if (page["next"].is_null()) return tasks;
            after = "&after=" + page["next"].dump();
        }
    }
    /// The identifier of the newest event.
    std::string lastEvent() const {
        RawClient client(host->socket());
        client.send("GET /v1/events?table=KAGDYST HTTP/1.1\r\n\r\n");
        const std::string head = client.readUntil("\r\n\r\n");
        const std::string field = "Last-Event-ID: ";
        const std::size_t at = head.find(field) + field.size();
        return head.substr(at, head.find("\r\n", at) - at);
    }
    std::vector<std::pair<std::string, std::string>> notes() const {
        std::istringstream text(home.files().read("notes"));
        std::vector<std::pair<std::string, std::string>> lines;
        for (std::string what, name; text >> what >> name;)
            lines.emplace_back(what, name);
        return lines;
    }

    /// Where journal, acceptances and the tasks' own notes do not agree.
    std::vector<std::string> faults() const {
        std::vector<std::string> found;
        const std::map<std::string, json> tasks = allTasks(found);
        for (const std::string& name : accepted) {
            if (tasks.count(name) == 0) found.push_back(name + " was accepted and is missing");
        }
        for (const std::string& name : refused) {
            if (tasks.count(name) != 0) found.push_back(name + " was refused and is there");
        }
        std::map<std::string, int> begun;
        std::map<std::string, int> ended;
        int last = -1;
        for (const auto& [what, name] : notes()) {
            if (what == "overlap") found.push_back(name + " ran beside another one");
            if (what == "end") ++ended[name];
            if (what != "begin") continue;
            ++begun[name];
            if (tasks.count(name) == 0) found.push_back(name + " ran without being known");
            if (name.front() != 'j') continue;
            const int number = std::stoi(name.substr(1));
            if (number <= last) found.push_back(name + " ran out of its turn");
            last = number;
        }
        for (const auto& [name, task] : tasks) {
            const std::string state = task["state"];
            const bool done = state == "done" && begun[name] == 1 && ended[name] == 1;
            const bool interrupted = state == "interrupted" && begun[name] <= 1;
            if (done || interrupted) continue;
            found.push_back(name + " is " + state + ", began " + std::to_string(begun[name]) +
                            " times and ended " + std::to_string(ended[name]) + " times");
        }
        return found;
    }

    ScriptHome home;
    std::optional<ManagedHost> host;
    bool mayBeFull = false;
    std::vector<std::string> accepted;
    std::vector<std::string> refused;
};
