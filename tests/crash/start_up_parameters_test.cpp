// Kills the host while an import rewrites the universal agent's start-up parameters: after the next
// start they are the old ones or the new ones.
//
//   ZAV_CRASH_KILLS=500 ZAV_CRASH_SEED=17 build/native/bin/crash_threaded_tests
//
// Without these variables it kills three times, with a seed of its own, which is printed.
// ctest-label: threaded

#include <gtest/gtest.h>
#include <signal.h>

#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <optional>
#include <random>
#include <thread>

#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/universal_agent.h"

namespace {

unsigned variableOr(const char* name, unsigned otherwise) {
    const char* const value = std::getenv(name);
    return value == nullptr ? otherwise : static_cast<unsigned>(std::strtoul(value, nullptr, 10));
}

/// So many that writing them takes a while.
std::string manyLines() {
    std::string lines;
    for (int i = 0; i < 30'000; ++i)
        lines += "i" + std::to_string(i) + "|CONSOLEPORT|0|\n";
    return lines;
}

TEST(KillsInARewriting, LeaveTheOldParametersOrTheNewOnes) {
    const unsigned kills = variableOr("ZAV_CRASH_KILLS", 3);
    const unsigned seed = variableOr("ZAV_CRASH_SEED", std::random_device()());
    std::cout << "seed " << seed << "\n";
    std::mt19937 random(seed);
    std::uniform_int_distribution<int> microseconds(0, 40'000);
    const std::string lines = manyLines();
    const UniversalAgentHome home(lines);
    const std::string before = home.files().read(UniversalAgentHome::kParameters);
    const std::string after = "|DATAPROVIDER|FILE,SCRP|\n" + lines;
    unsigned changed = 0;
    ManagedHost host(home.path(), {{"QVSDEPLOY_AGENTDEPOT", home.depot()}}, {},
                     ManagedHost::Guards::On);
    for (unsigned round = 0; round < kills; ++round) {
        const std::size_t calls = home.agentCalls().size();
        // What the killed host was doing may not have ended yet.
        ASSERT_TRUE(eventually([&] {
            RawClient client(host.socket());
            return client.post("/v1/query", home.importRequest().dump()).status == 200;
        }));
        ASSERT_TRUE(eventually([&] { return home.agentCalls().size() > calls; }));
        std::this_thread::sleep_for(std::chrono::microseconds(microseconds(random)));
        host.program().signal(SIGKILL);
        EXPECT_EQ(host.program().wait().status, 128 + SIGKILL);
        host.start();
        const std::string now = home.files().read(UniversalAgentHome::kParameters);
        EXPECT_TRUE(now == before || now == after)
            << "round " << round << ", " << now.size() << " bytes";
        EXPECT_FALSE(home.files().exists(UniversalAgentHome::kSavedParameters)) << round;
        if (now == after) ++changed;
        home.files().write(UniversalAgentHome::kParameters, before);
    }
    std::cout << kills << " kills, after " << changed << " the parameters were the new ones\n";
}

}  // namespace
