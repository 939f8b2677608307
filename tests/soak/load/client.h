/// Clients, many of them on one thread.
#pragma once

#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "soak/chance.h"
#include "soak/host_clock.h"
#include "soak/ledger.h"
#include "soak/load/connection.h"
#include "soak/load/subscriptions.h"
#include "soak/soak_home.h"
#include "soak/tally.h"

namespace soak {

class Client;

/// What all clients share.
struct World {
    World(std::uint64_t seed, const SoakHome& soakHome)
        : chance(seed), ledger("soak-" + std::to_string(seed) + "-"), home(soakHome) {}

    Chance chance;
    Tally tally;
    Ledger ledger;
    HostClock clock;
    const SoakHome& home;
    /// Ended subscriptions, to be judged when all rows have come.
    std::vector<SubscriptionRecord> subscriptions;
    /// Clients that join at the next turn.
    std::vector<std::unique_ptr<Client>> joining;
    /// Requests to /v1/tasks whose answers were lost, to be made again as they were.
    std::vector<std::pair<Ledger::Number, std::string>> repeats;
    /// Set while the host is dead and connections may end in any way.
    bool hostIsDead = false;
    /// Set while clients are to come to an end by themselves as soon as they can.
    bool draining = false;
};

/// One client. It is stepped when its descriptor is ready or its time has come.
class Client {
public:
    Client(World& world, std::string kind, std::string path)
        : world_(world), kind_(std::move(kind)), path_(std::move(path)) {}
    virtual ~Client() = default;
    Client(const Client&) = delete;
    Client& operator=(const Client&) = delete;

    const std::string& kind() const { return kind_; }
    int descriptor() const { return connection_.descriptor(); }
    virtual bool wantsToRead() const { return true; }
    virtual bool wantsToWrite() const { return connection_.hasUnsent(); }
    /// In seconds of the host's clock.
    double wakeAt() const { return wakeAt_; }

    /// Connects, or does the next step; false when the client has come to its end.
    bool step(bool readable, bool writable);
    /// The host is dead; whatever it had sent has been read.
    virtual void hostDied() {}

protected:
    /// Called once, when the connection stands.
    virtual bool begin() = 0;
    virtual bool proceed(bool readable, bool writable) = 0;
    /// The socket took no connection.
    virtual void notConnected() {}

    double now() const { return world_.clock.now(); }
    void wakeIn(double seconds) { wakeAt_ = now() + seconds; }

    World& world_;
    Connection connection_;

private:
    const std::string kind_;
    const std::string path_;
    double wakeAt_ = 0;
};

/// All clients.
class Crowd {
public:
    explicit Crowd(World& world) : world_(world) {}
    void add(std::unique_ptr<Client> client);
    /// Waits a moment for something to happen and steps whom it concerns.
    void turn();
    /// The host is dead: all read what it has left for them and come to their end.
    void loseHost();
    /// All go, at whatever they are.
    void clear();
    std::size_t count(const std::string& kind) const;
    std::size_t size() const { return clients_.size(); }
    const std::map<std::string, std::size_t>& kinds() const { return kinds_; }

private:
    World& world_;
    std::vector<std::unique_ptr<Client>> clients_;
    std::map<std::string, std::size_t> kinds_;
    double nextNudge_ = 0;
};

}  // namespace soak
