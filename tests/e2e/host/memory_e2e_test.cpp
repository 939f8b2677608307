// What the host holds after a burst of work that needs a lot of memory.

#include <gtest/gtest.h>

#include <memory>
#include <vector>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

// Instrumented programs keep freed memory for a while.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool kMeasuresMemory = false;
#else
constexpr bool kMeasuresMemory = true;
#endif

/// Configurations behind 3 MB of other output, fetched by several clients at a time.
void fetchAtOnce(const ManagedHost& host, int clients) {
    std::vector<std::unique_ptr<Program>> running;
    for (int i = 0; i < clients; ++i)
        running.push_back(host.startZavctl({"config", "get", "ux"}));
    for (const auto& client : running) {
        const ProgramResult result = client->wait(std::chrono::seconds(120));
        ASSERT_EQ(result.status, 0) << result.out << result.err;
        ASSERT_NE(result.out.find("INSTANCE=one"), std::string::npos);
    }
}

TEST(Memory, LargeOutputsOfManyCommandsAtATimeGiveTheirMemoryBack) {
    if (!kMeasuresMemory) GTEST_SKIP() << "the sanitizer keeps freed memory";
    ScriptHome home;
    home.products({"ux"}, "head -c 3000000 /dev/zero | tr '\\0' x; printf '\\nINSTANCE=one\\n'");
    ManagedHost host(home.path());
    fetchAtOnce(host, 1);
    const long before = host.residentKiB();
    for (int round = 0; round < 3; ++round)
        fetchAtOnce(host, 12);
    EXPECT_LT(host.residentKiB(), before + 4096) << before << " before";
}

}  // namespace
