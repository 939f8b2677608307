// A host that has done a lot of work holds no more than one that has done a little.
// ctest-label: threaded

#include <gtest/gtest.h>
#include <unistd.h>

#include <nlohmann/json.hpp>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

using nlohmann::json;

// Instrumented programs keep freed memory for a while and are slow; they do less of the same.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr int kShare = 10;
constexpr bool kMeasuresMemory = false;
#else
constexpr int kShare = 1;
constexpr bool kMeasuresMemory = true;
#endif

struct Figures {
    int descriptors;
    int threads;
    int children;
    long residentKiB;
};

Figures figuresOf(const ManagedHost& host) {
    return {host.openDescriptors(), host.threads(), host.children(), host.residentKiB()};
}

void refuseRequests(const ManagedHost& host, int count) {
    const std::string body =
        R"({"table":"KAGREQT","where":[{"column":"COMMAND","op":"=","value":"JUMP"},)"
        R"({"column":"TRANSID","op":"=","value":"x"}]})";
    const std::string request =
        "POST /v1/query HTTP/1.1\r\nHost: x\r\nConnection: close\r\nContent-Length: " +
        std::to_string(body.size()) + "\r\n\r\n" + body;
    for (int i = 0; i < count; ++i) {
        ASSERT_NE(host.exchange(request).find("\"RETVAL\":1006"), std::string::npos);
    }
}

void openAndDropSubscriptions(const ManagedHost& host, int count) {
    const std::string request = "GET /v1/events?table=KAGDYST HTTP/1.1\r\nHost: x\r\n\r\n";
    for (int i = 0; i < count; ++i) {
        const int descriptor = host.connect();
        ASSERT_EQ(::write(descriptor, request.data(), request.size()),
                  static_cast<ssize_t>(request.size()));
        char head[12] = {};
        ASSERT_GT(::read(descriptor, head, sizeof head), 0) << "the subscription is live";
        ::close(descriptor);
    }
}

/// Starts that all find their way to the agent script, half of them in vain.
void startAgents(const ManagedHost& host, int count) {
    const auto watcher = host.startZavctl({"events", "--count", std::to_string(count)});
    ASSERT_TRUE(eventually([&] {
        return json::parse(host.zavctl({"--json", "status"}).out)["subscriptions"] == 1;
    }));
    for (int i = 0; i < count; ++i) {
        ASSERT_EQ(host.zavctl({"start", i % 2 == 0 ? "ux" : "nope", "--no-wait"}).status, 0);
    }
    const ProgramResult result = watcher->wait(std::chrono::seconds(180));
    ASSERT_EQ(result.status, 0) << result.err;
    int failed = 0;
    const json events = json::parse(result.out)["events"];
    for (const json& event : events)
        failed += event["RETVAL"] == 0 ? 0 : 1;
    EXPECT_EQ(failed, count / 2);
}

TEST(Resources, ManyRequestsSubscriptionsAndTasksLeaveNothingBehind) {
    ScriptHome home;
    home.agentScript("test $product = ux");
    ManagedHost host(home.path());
    // What is made once and kept: threads of the pool, buffers, the string library's locale, the
    // journal's pages, and the pieces of memory that tasks leave behind until they find each other
    // again: they grow with the first dozens of tasks and no further.
    refuseRequests(host, 1200 / kShare);
    openAndDropSubscriptions(host, 100 / kShare);
    startAgents(host, 20 / kShare);
    ASSERT_TRUE(eventually([&] {
        return json::parse(host.zavctl({"--json", "status"}).out)["subscriptions"] == 0;
    }));
    const Figures before = figuresOf(host);

    refuseRequests(host, 5000 / kShare);
    openAndDropSubscriptions(host, 1000 / kShare);
    startAgents(host, 40 / kShare);

    EXPECT_TRUE(eventually([&] { return host.openDescriptors() <= before.descriptors; }))
        << host.openDescriptors() << " descriptors, " << before.descriptors << " before";
    EXPECT_LE(host.threads(), before.threads);
    EXPECT_EQ(host.children(), 0);
    if (kMeasuresMemory) {
        EXPECT_LT(host.residentKiB(), before.residentKiB + 1024);
    }
}

}  // namespace
