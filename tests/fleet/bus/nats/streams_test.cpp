#include "fleet/bus/nats/streams.h"

#include <gtest/gtest.h>

#include <string>

#include "fleet/bus/nats/connecting.h"
#include "fleet/bus/nats/store.h"

using connecting::connectedTo;
using connecting::kPatience;

namespace {

const fleet::StreamLimits kLimits{1 << 20, 1};

}  // namespace

TEST(EnsureStream, MakesTheStreamsOnceAsTheyAreWanted) {
    const NatsServer server;
    const auto bus = connectedTo(server);
    for (const auto& settings : {fleet::tasksStream(kLimits), fleet::outStream(kLimits),
                                 fleet::hostsStream(kLimits), fleet::centreStream(kLimits)}) {
        for (const bool made : {true, false}) {
            const auto result = ensureStream(*bus, settings, kPatience);
            EXPECT_TRUE(result.status.done()) << settings.name << ": " << result.status.text;
            EXPECT_EQ(result.made, made) << settings.name;
            EXPECT_TRUE(result.differences.empty()) << result.differences.front();
        }
    }
}

TEST(EnsureStream, TellsHowOneThatIsThereDiffersAndLeavesIt) {
    const NatsServer server;
    const auto bus = connectedTo(server);
    ASSERT_TRUE(ensureStream(*bus, fleet::tasksStream({1 << 20, 1}), kPatience).status.done());
    for (int round = 0; round < 2; ++round) {
        const auto result = ensureStream(*bus, fleet::tasksStream({2 << 20, 1}), kPatience);
        EXPECT_TRUE(result.status.done());
        EXPECT_FALSE(result.made);
        ASSERT_EQ(result.differences.size(), 1U);
        EXPECT_EQ(result.differences.front(), "max_bytes is 1048576, not 2097152");
    }
}

TEST(EnsureStream, SaysWhyTheServerRefuses) {
    const NatsServer server;
    const auto bus = connectedTo(server);
    const auto result = ensureStream(*bus, fleet::tasksStream({1 << 20, 3}), kPatience);
    EXPECT_EQ(result.status.kind, fleet::BusStatus::Kind::Refused);
    EXPECT_NE(result.status.text, "");
}

TEST(HostsStream, LetsNoHeaderDropTheMessagesOfOthers) {
    const NatsServer server;
    const auto bus = connectedTo(server);
    ASSERT_TRUE(ensureStream(*bus, fleet::hostsStream(kLimits), kPatience).status.done());
    store(*bus, "$KV.HOSTS.a", "a", kPatience);
    for (const char* what : {"all", "sub"}) {
        const auto reply = bus->request("$KV.HOSTS.b", "b", kPatience, {{"Nats-Rollup", what}});
        EXPECT_NE(reply.message.data.find("rollup not permitted"), std::string::npos)
            << reply.message.data;
    }
    EXPECT_EQ(lastOn(*bus, "KV_HOSTS", "$KV.HOSTS.a", kPatience).bytes, "a");
}

TEST(OutStream, KeepsTheLastOfEachHostAndSoNoHostDisplacesAnother) {
    const NatsServer server;
    const auto bus = connectedTo(server);
    ASSERT_TRUE(ensureStream(*bus, fleet::outStream(kLimits), kPatience).status.done());
    const auto quiet = store(*bus, "out.quiet", "q", kPatience);
    for (int i = 0; i < 200; ++i)
        bus->publish("out.loud", "l");
    ASSERT_TRUE(bus->flush(kPatience).done());
    const auto last = store(*bus, "out.loud", "l", kPatience);
    EXPECT_EQ(last.sequence, quiet.sequence + 201);
    EXPECT_EQ(lastOn(*bus, "OUT", "out.quiet", kPatience).sequence, quiet.sequence);
}
