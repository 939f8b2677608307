/// The configuration as it was made, with a real server of the bus.
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <memory>
#include <random>
#include <stdexcept>
#include <string>

#include "fleet/bus/nats/claims.h"
#include "fleet/bus/nats/connection.h"
#include "fleet/bus/nats/streams.h"
#include "fleet/server/keys/setup/rotate_keys.h"
#include "fleet/server/keys/trust/account_tokens.h"
#include "support/host/program.h"
#include "tests/fleet/server/keys/made_fleet.h"

namespace {

using fleet::Connection;
using fleet::KeyKind;
using fleet::KeyPair;
using made_fleet::MadeFleet;
using Failure = Connection::Result::Failure;

constexpr std::chrono::seconds kPatience{20};

fleet::Moment today() {
    return std::chrono::duration_cast<fleet::Moment>(
        std::chrono::system_clock::now().time_since_epoch());
}

/// A fleet made a minute ago, with its server on a port of its own.
class RunningFleet {
public:
    static std::unique_ptr<RunningFleet> start() {
        std::random_device source;
        for (int attempt = 0; attempt < 20; ++attempt) {
            const int port = std::uniform_int_distribution(12000, 31999)(source);
            auto running = std::make_unique<RunningFleet>(port);
            if (running->isReady()) return running;
        }
        throw std::runtime_error("nats-server does not start");
    }

    explicit RunningFleet(int port)
        : made_([port](fleet::FleetPlan& plan) {
              plan.busUrls = {"nats://localhost:" + std::to_string(port)};
              plan.now = today() - std::chrono::minutes(1);
              plan.until = plan.now + made_fleet::kDay;
              plan.authorityUntil = plan.until;
          }),
          server_({"/usr/bin/setpriv", "--pdeathsig", "KILL", "/usr/sbin/nats-server", "-c",
                   made_.scratch().path("keys/bus/nats-server.conf")}) {}

    bool isReady() {
        eventually([&] { return hasSaid("Server is ready") || !server_.running(); });
        return hasSaid("Server is ready");
    }
    const MadeFleet& made() const { return made_; }

    Connection::Result connect(const KeyPair& key, const std::string& token,
                               const fleet::ConnectionEvents& events = {}) const {
        const fleet::FleetFacts facts = made_.directory().facts();
        fleet::ConnectionOptions options;
        options.urls = facts.busUrls;
        options.tls = fleet::TlsOptions{made_.directory().authorityFile(), facts.names.front()};
        options.credentials = fleet::UserToken{
            [token] { return token; }, [key](std::string_view nonce) { return key.sign(nonce); }};
        options.inboxPrefix = fleet::inboxPrefixOf(key.publicKey());
        options.events = events;
        return Connection::connect(options);
    }
    Connection::Result connect(const fleet::BusUser& user,
                               const fleet::ConnectionEvents& events = {}) const {
        return connect(user.key, user.token, events);
    }
    std::string hostToken(const KeyPair& host) const {
        return hostUserToken(made_.directory().bus().hostSigner,
                             made_.directory().facts().accounts.hosts,
                             {host.publicKey(),
                              "a host",
                              std::chrono::duration_cast<fleet::TokenTime>(today()),
                              {}});
    }
    /// As the centre does at its start and after revocations.
    void tellAccounts(const fleet::Revocations& hosts) const {
        const fleet::BusKeys bus = made_.directory().bus();
        const auto system = connect(bus.system);
        ASSERT_TRUE(system.connection) << system.text;
        const auto now = std::chrono::duration_cast<fleet::TokenTime>(today());
        for (const std::string& token : accountTokens(made_.directory().facts(), bus, hosts, now)) {
            const auto status =
                updateAccount(*system.connection, token, bus.accountSigner.publicKey(), kPatience);
            ASSERT_TRUE(status.done()) << status.text;
        }
    }

private:
    bool hasSaid(const std::string& text) const {
        return server_.err().find(text) != std::string::npos;
    }

    const MadeFleet made_;
    Program server_;
};

class RunningBus : public testing::Test {
protected:
    const std::unique_ptr<RunningFleet> fleet_ = RunningFleet::start();
    const KeyPair host_ = KeyPair::make(KeyKind::User);
};

TEST_F(RunningBus, TakesTheCentreAndHostsOverTlsAndNobodyElse) {
    const auto centre = fleet_->connect(fleet_->made().directory().bus().centre);
    ASSERT_TRUE(centre.connection) << centre.text;
    EXPECT_TRUE(centre.connection->flush(kPatience).done());
    const auto host = fleet_->connect(host_, fleet_->hostToken(host_));
    ASSERT_TRUE(host.connection) << host.text;
    EXPECT_TRUE(host.connection->flush(kPatience).done());
    const MadeFleet stranger;
    EXPECT_EQ(fleet_->connect(stranger.directory().bus().centre).failure, Failure::Refused);
}

TEST_F(RunningBus, CutsAHostOffByTheKeyThatSignsAccounts) {
    std::atomic<bool> isCut{false};
    fleet::ConnectionEvents events;
    events.closed = [&](const std::string&) { isCut = true; };
    const std::string token = fleet_->hostToken(host_);
    const auto host = fleet_->connect(host_, token, events);
    ASSERT_TRUE(host.connection) << host.text;
    const KeyPair other = KeyPair::make(KeyKind::User);
    ASSERT_NO_FATAL_FAILURE(fleet_->tellAccounts({{host_.publicKey(), fleet::kForEver}}));
    EXPECT_TRUE(eventually([&] { return isCut.load(); }));
    EXPECT_EQ(fleet_->connect(host_, token).failure, Failure::Refused);
    EXPECT_EQ(fleet_->connect(host_, fleet_->hostToken(host_)).failure, Failure::Refused);
    EXPECT_TRUE(fleet_->connect(other, fleet_->hostToken(other)).connection);
}

TEST_F(RunningBus, RefusesTheEarlierUsersOnceTheNextCentreHasStarted) {
    const fleet::FleetDirectory& directory = fleet_->made().directory();
    const fleet::BusUser earlier = directory.bus().centre;
    rotateKeys(directory, fleet_->made().root(), today(), today() + made_fleet::kDay);
    const auto running = fleet_->connect(earlier);
    EXPECT_TRUE(running.connection) << running.text;  // nobody has told the server yet
    ASSERT_NO_FATAL_FAILURE(fleet_->tellAccounts({}));
    EXPECT_EQ(fleet_->connect(earlier).failure, Failure::Refused);
    const auto next = fleet_->connect(directory.bus().centre);
    EXPECT_TRUE(next.connection) << next.text;
}

}  // namespace
