#include "ctl/verbs/arguments/global_arguments.h"

#include <gtest/gtest.h>

#include "support/scoped_env.h"

namespace {

using ctl::Values;

Values noValues() {
    Values given;
    for (const ctl::Argument& argument : ctl::kGlobalArguments)
        given.add(argument);
    return given;
}

TEST(GlobalArguments, LeaveTheHostWhereTheEnvironmentSays) {
    const ScopedEnv named("ZAV_SOCKET", "/tmp/named");
    const ctl::HostAddress host = ctl::hostAddressOf(noValues());
    EXPECT_EQ(host.socket, "/tmp/named");
    EXPECT_EQ(host.rpcSocket, "/tmp/named.rpc");
    EXPECT_EQ(host.timeout, std::chrono::seconds(660));
}

TEST(GlobalArguments, NameTheHostAndItsTimeOut) {
    const ScopedEnv named("ZAV_SOCKET", "/tmp/named");
    Values given;
    given.add(ctl::kSocket).text = "/tmp/a";
    given.add(ctl::kRpcSocket).text = "";
    given.add(ctl::kTimeout).seconds = 0.25;
    EXPECT_EQ(ctl::hostAddressOf(given).socket, "/tmp/a");
    EXPECT_EQ(ctl::hostAddressOf(given).rpcSocket, "/tmp/a.rpc");
    EXPECT_EQ(ctl::hostAddressOf(given).timeout, std::chrono::milliseconds(250));
    Values transfers;
    transfers.add(ctl::kSocket).text = "/tmp/a";
    transfers.add(ctl::kRpcSocket).text = "/tmp/b";
    transfers.add(ctl::kTimeout);
    EXPECT_EQ(ctl::hostAddressOf(transfers).rpcSocket, "/tmp/b");
}

TEST(GlobalArguments, ChooseTheFormat) {
    EXPECT_EQ(ctl::formatOf(noValues()), ctl::Format::Text);
    Values given;
    given.add(ctl::kJson).flag = true;
    EXPECT_EQ(ctl::formatOf(given), ctl::Format::Json);
}

}  // namespace
