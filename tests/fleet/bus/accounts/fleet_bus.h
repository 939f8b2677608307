/// A server of the bus with a fleet's accounts, for tests.
#pragma once

#include <chrono>
#include <functional>
#include <map>
#include <memory>
#include <string>

#include "fleet/bus/accounts/fleet_accounts.h"
#include "fleet/bus/nats/connecting.h"
#include "fleet/bus/nats/streams.h"

/// All of a fleet's keys, its server, and whoever connects to it.
class FleetBus {
public:
    /// The accounts as they were made a minute ago, so that there are later seconds for changes.
    FleetBus()
        : madeAt_(now() - std::chrono::minutes(1)),
          server_(fleet::accountsConfiguration(keys_, "@DIR@/accounts", madeAt_)) {}

    static fleet::TokenTime now() {
        return std::chrono::duration_cast<std::chrono::seconds>(
            std::chrono::system_clock::now().time_since_epoch());
    }

    const fleet::FleetKeys& keys() const { return keys_; }
    NatsServer& server() { return server_; }
    fleet::TokenTime madeAt() const { return madeAt_; }

    fleet::ConnectionOptions optionsOf(const fleet::KeyPair& user, const std::string& token) const {
        fleet::ConnectionOptions options = connecting::optionsFor(server_);
        options.credentials = fleet::UserToken{
            [token] { return token; }, [user](std::string_view nonce) { return user.sign(nonce); }};
        options.inboxPrefix = fleet::inboxPrefixOf(user.publicKey());
        return options;
    }

    std::string hostToken(const fleet::KeyPair& host, const std::string& name = "a host") const {
        return fleet::hostUserToken(keys_.hostSigner, keys_.hosts.publicKey(),
                                    {host.publicKey(), name, madeAt_, {}});
    }
    fleet::ConnectionOptions hostOptions(const fleet::KeyPair& host,
                                         const std::string& name = "a host") const {
        return optionsOf(host, hostToken(host, name));
    }
    std::unique_ptr<fleet::Connection> centre() const { return full(keys_.control); }
    std::unique_ptr<fleet::Connection> system() const { return full(keys_.system); }

private:
    std::unique_ptr<fleet::Connection> full(const fleet::KeyPair& account) const {
        const auto user = fleet::KeyPair::make(fleet::KeyKind::User);
        return connecting::connected(optionsOf(
            user, fleet::fullUserToken(account, {user.publicKey(), "full", madeAt_, {}})));
    }

    const fleet::FleetKeys keys_ = fleet::FleetKeys::make();
    const fleet::TokenTime madeAt_;
    NatsServer server_;
};
