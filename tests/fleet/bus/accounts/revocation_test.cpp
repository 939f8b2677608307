#include <gtest/gtest.h>

#include <atomic>
#include <string>

#include "fleet/bus/accounts/fleet_bus.h"
#include "fleet/bus/nats/claims.h"
#include "support/host/program.h"

using connecting::connected;
using connecting::kPatience;
using fleet::Connection;
using fleet::KeyKind;
using fleet::KeyPair;

namespace {

class Revocation : public testing::Test {
protected:
    fleet::BusStatus revoke(const KeyPair& host) {
        const auto system = fleet_.system();
        return updateAccount(
            *system,
            hostsToken(fleet_.keys(), FleetBus::now(), {{host.publicKey(), FleetBus::now()}}),
            root(), kPatience);
    }
    const std::string& root() const { return fleet_.keys().root.publicKey(); }
    Connection::Result::Failure failureOf(const KeyPair& host) {
        return Connection::connect(fleet_.hostOptions(host)).failure;
    }

    FleetBus fleet_;
    const KeyPair h_ = KeyPair::make(KeyKind::User);
    const KeyPair g_ = KeyPair::make(KeyKind::User);
};

}  // namespace

TEST_F(Revocation, CutsTheConnectionOfOneHostAndOfNoOther) {
    std::atomic<bool> cut{false};
    fleet::ConnectionOptions options = fleet_.hostOptions(h_);
    options.events.closed = [&](const std::string&) { cut = true; };
    const auto revoked = connected(options);
    std::atomic<int> otherLeft{0};
    options = fleet_.hostOptions(g_);
    options.events.disconnected = [&] { ++otherLeft; };
    const auto other = connected(options);
    const auto status = revoke(h_);
    ASSERT_TRUE(status.done()) << status.text;
    EXPECT_TRUE(eventually([&] { return cut.load(); }));
    EXPECT_EQ(failureOf(h_), Connection::Result::Failure::Refused);
    EXPECT_TRUE(other->flush(kPatience).done());
    EXPECT_EQ(otherLeft, 0);
}

TEST_F(Revocation, HoldsOverARestartOfTheServer) {
    ASSERT_TRUE(revoke(h_).done());
    fleet_.server().stop();
    fleet_.server().start();
    EXPECT_EQ(failureOf(h_), Connection::Result::Failure::Refused);
    EXPECT_EQ(failureOf(g_), Connection::Result::Failure::None);
}

TEST_F(Revocation, LeavesLaterTokensOfTheSameKey) {
    ASSERT_TRUE(revoke(h_).done());
    const auto later = fleet::hostUserToken(
        fleet_.keys().hostSigner, fleet_.keys().hosts.publicKey(),
        {h_.publicKey(), "a host", FleetBus::now() + std::chrono::seconds(30), {}});
    EXPECT_TRUE(Connection::connect(fleet_.optionsOf(h_, later)).connection);
}

TEST_F(Revocation, IsForTheServersOwnAccountOnly) {
    const auto centre = fleet_.centre();
    const auto token =
        hostsToken(fleet_.keys(), FleetBus::now(), {{h_.publicKey(), FleetBus::now()}});
    EXPECT_FALSE(updateAccount(*centre, token, root(), std::chrono::milliseconds(100)).done());
    EXPECT_EQ(failureOf(h_), Connection::Result::Failure::None);
}

TEST_F(Revocation, SendsOnlyWhatTheRootHasSigned) {
    fleet::FleetKeys others = fleet_.keys();
    others.root = KeyPair::make(KeyKind::Operator);
    const auto system = fleet_.system();
    const std::string good = hostsToken(fleet_.keys(), FleetBus::now());
    for (const std::string& token : {hostsToken(others, FleetBus::now()), std::string("no token"),
                                     std::string(), good + "A", good.substr(1)}) {
        const auto status = updateAccount(*system, token, root(), kPatience);
        EXPECT_EQ(status.kind, fleet::BusStatus::Kind::Refused);
    }
    fleet_.server().stop();
    fleet_.server().start();
    EXPECT_EQ(failureOf(h_), Connection::Result::Failure::None);
}

TEST_F(Revocation, LetsNobodyInByAnothersSignatureAndIsMendedByTheRoots) {
    fleet::FleetKeys others = fleet_.keys();
    others.root = KeyPair::make(KeyKind::Operator);
    others.hostSigner = KeyPair::make(KeyKind::Account);
    const auto system = fleet_.system();
    const auto foreign = hostsToken(others, FleetBus::now() - std::chrono::seconds(10));
    system->request("$SYS.REQ.CLAIMS.UPDATE", foreign, kPatience);
    const auto theirs = fleet::hostUserToken(others.hostSigner, others.hosts.publicKey(),
                                             {h_.publicKey(), "a host", fleet_.madeAt(), {}});
    EXPECT_FALSE(Connection::connect(fleet_.optionsOf(h_, theirs)).connection);
    fleet_.server().stop();
    fleet_.server().start();
    EXPECT_FALSE(Connection::connect(fleet_.optionsOf(h_, theirs)).connection);
    const auto again = fleet_.system();
    const auto status =
        updateAccount(*again, hostsToken(fleet_.keys(), FleetBus::now()), root(), kPatience);
    EXPECT_TRUE(status.done()) << status.text;
    EXPECT_EQ(failureOf(h_), Connection::Result::Failure::None);
    EXPECT_FALSE(Connection::connect(fleet_.optionsOf(h_, theirs)).connection);
}
