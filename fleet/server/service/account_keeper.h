/// Keeps the bus's accounts as the centre wants them.
#pragma once

#include <atomic>
#include <functional>
#include <string>

#include "fleet/bus/nats/connection.h"
#include "fleet/loop/worker.h"
#include "fleet/server/keys/directory/fleet_directory.h"

namespace fleet {

/// Tells the bus at the start, and whenever a key has been revoked, whose keys count no longer. Has
/// a thread and a connection of its own, because that may take as long as the bus wants.
class AccountKeeper {
public:
    /// `options` reach the bus, but for who comes. The directory is read each time anew.
    AccountKeeper(const std::string& directory, ConnectionOptions options);
    ~AccountKeeper();
    AccountKeeper(const AccountKeeper&) = delete;
    AccountKeeper& operator=(const AccountKeeper&) = delete;

    /// Has it tell the bus all accounts once more, at its next look.
    void tellAgain() { told_ = -1; }
    /// How often the bus has taken all accounts.
    int rounds() const { return rounds_; }

private:
    void work();
    bool tell(Connection& connection);

    const FleetDirectory directory_;
    ConnectionOptions options_;
    std::atomic<int> rounds_{0};
    std::atomic<std::int64_t> told_{-1};  ///< the count of revocations that the bus knows
    TokenTime last_{};
    Worker worker_;  ///< last: it uses everything above
};

}  // namespace fleet
