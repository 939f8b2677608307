// Cancels tasks at random moments, RESTART among them, and compares what they did with their
// states.
//
//   export ZAV_CANCELS=1000 ZAV_CANCEL_SEED=17
//   build/native/bin/crash_threaded_tests --gtest_filter='RandomCancels.*'
//
// Without these variables it cancels eight times, with a seed of its own, which is printed.
// ctest-label: threaded

#include <gtest/gtest.h>

#include <iostream>
#include <map>
#include <nlohmann/json.hpp>
#include <random>
#include <sstream>
#include <thread>

#include "crash/variable_or.h"
#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

using nlohmann::json;

class RandomCancels : public testing::Test {
protected:
    RandomCancels() {
        home.products({}, "exit 0");
        home.agentScript("echo begin $verb $product >>'" + notesFile() + "'\n" + "sleep 0.1\n" +
                         "echo end $verb $product >>'" + notesFile() + "'");
    }

    std::string notesFile() const { return home.files().path("notes"); }
    std::string notes() const { return home.files().read("notes"); }
    int count(const std::string& line) const {
        int found = 0;
        std::istringstream text(notes());
        for (std::string each; std::getline(text, each);)
            found += each == line ? 1 : 0;
        return found;
    }
    RawClient::Answer post(const std::string& target, const json& body) const {
        RawClient client(host.socket());
        return client.post(target, body.dump());
    }
    std::string accept(const std::string& command, const std::string& product) const {
        const auto reply =
            post("/v1/tasks", {{"command", command}, {"product", product}, {"force", true}});
        EXPECT_EQ(reply.status, 202U) << reply.body;
        return json::parse(reply.body)["id"];
    }
    std::string endOf(const std::string& id) const {
        RawClient client(host.socket());
        return json::parse(client.get("/v1/tasks/" + id + "?wait=60").body)["state"];
    }
    /// What the task noted fits its state, and the answer to who cancelled it.
    void compare(const std::string& state, const RawClient::Answer& reply,
                 const std::string& product) const {
        const int begun = count("begin start " + product);
        const int ended = count("end start " + product);
        if (state == "done") {
            EXPECT_EQ(reply.status, 409U) << reply.body;
            EXPECT_EQ(begun, 1) << product;
            EXPECT_EQ(ended, 1) << product;
        } else {
            EXPECT_EQ(state, "cancelled") << product;
            EXPECT_EQ(reply.status, 200U) << reply.body;
            EXPECT_LE(ended, begun) << product;
            EXPECT_LE(begun, 1) << product;
        }
    }

    ScriptHome home;
    const ManagedHost host{home.path(),
                           Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}},
                           {},
                           ManagedHost::Guards::On};
};

TEST_F(RandomCancels, AgreeWithWhatTheTasksDid) {
    const unsigned cancels = variableOr("ZAV_CANCELS", 8);
    const unsigned seed = variableOr("ZAV_CANCEL_SEED", std::random_device()());
    std::cout << cancels << " cancels with the seed " << seed << std::endl;
    std::mt19937 random(seed);
    std::uniform_int_distribution<int> delays(0, 150'000);
    std::map<std::string, int> states;
    for (unsigned round = 0; round < cancels; ++round) {
        const std::string product = "p" + std::to_string(round);
        const std::string id = accept(round % 2 == 0 ? "RESTART" : "START", product);
        // The random moment itself.
        std::this_thread::sleep_for(std::chrono::microseconds(delays(random)));
        const auto reply = post("/v1/tasks/" + id + "/cancel", nullptr);
        const std::string state = endOf(id);
        ++states[state];
        const std::string then = notes();
        compare(state, reply, product);
        EXPECT_EQ(notes(), then) << "its end was told, so nothing of it runs any more";
    }
    for (const auto& [state, number] : states)
        std::cout << number << ' ' << state << std::endl;
    const std::string before = notes();
    EXPECT_EQ(endOf(accept("START", "last")), "done");
    EXPECT_EQ(notes(), before + "begin start last\nend start last\n")
        << "what was cancelled started nothing afterwards";
}

}  // namespace
