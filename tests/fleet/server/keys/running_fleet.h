/// A fleet with its own keys and a real server of the bus, configured as they say.
#pragma once

#include <gtest/gtest.h>

#include <chrono>
#include <memory>
#include <random>
#include <stdexcept>
#include <string>

#include "fleet/bus/nats/claims.h"
#include "fleet/bus/nats/connection.h"
#include "fleet/server/keys/trust/account_tokens.h"
#include "support/host/program.h"
#include "tests/fleet/server/keys/made_fleet.h"

namespace made_fleet {

constexpr std::chrono::seconds kPatience{60};
/// A centre asks the bus for several things, each of which may wait for a busy disk.
constexpr std::chrono::minutes kWorksWithin{4};

inline fleet::Moment today() {
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
              plan.until = plan.now + kDay;
              plan.authorityUntil = plan.until;
          }),
          server_({"/usr/bin/setpriv", "--pdeathsig", "KILL", "/usr/sbin/nats-server", "-c",
                   made_.scratch().path("keys/bus/nats-server.conf")}) {}

    bool isReady() {
        eventually([&] { return hasSaid("Server is ready") || !server_.running(); });
        return hasSaid("Server is ready");
    }
    const MadeFleet& made() const { return made_; }

    fleet::Connection::Result connect(const fleet::KeyPair& key, const std::string& token,
                                      const fleet::ConnectionEvents& events = {}) const {
        const fleet::FleetFacts facts = made_.directory().facts();
        fleet::ConnectionOptions options;
        options.urls = facts.busUrls;
        options.tls = fleet::TlsOptions{made_.directory().authorityFile(), facts.names.front()};
        options.credentials = fleet::UserToken{
            [token] { return token; }, [key](std::string_view nonce) { return key.sign(nonce); }};
        options.inboxPrefix = fleet::inboxPrefixOf(key.publicKey());
        options.events = events;
        return fleet::Connection::connect(options);
    }
    fleet::Connection::Result connect(const fleet::BusUser& user,
                                      const fleet::ConnectionEvents& events = {}) const {
        return connect(user.key, user.token, events);
    }
    std::string hostToken(const fleet::KeyPair& host) const {
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

}  // namespace made_fleet
