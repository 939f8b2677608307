/// zavfleetd at work, as its directory says.
#pragma once

#include <atomic>
#include <cstdint>
#include <future>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "fleet/server/keys/directory/fleet_directory.h"
#include "fleet/server/keys/trust/trust_database.h"
#include "fleet/server/program/centre_program.h"
#include "fleet/server/rollouts/rollouts.h"
#include "fleet/server/service/account_keeper.h"
#include "fleet/server/store/sqlite_rollout_store.h"

namespace fleet {

/// What an administrator chooses for a run of the centre.
struct ServiceOptions {
    std::string directory;                              ///< see FleetDirectory
    std::int64_t tasksBytes = std::int64_t{512} << 20;  ///< all orders on the bus together
    int replicas = 1;  ///< servers of the bus that have each message
};

/// What the functions given to a CentreService may use.
struct CentreDesk {
    CentreParts& parts;
    Rollouts& rollouts;
    RolloutStore& rolloutStore;
    Moment now{};
};

/// The centre with its roll-outs, its list of revoked keys and the bus's accounts. The orders'
/// database is in "orders" in the directory.
class CentreService {
public:
    /// Throws KeysError, StoreError or sqlite::DatabaseError.
    explicit CentreService(const ServiceOptions& options);
    ~CentreService();
    CentreService(const CentreService&) = delete;
    CentreService& operator=(const CentreService&) = delete;

    /// Works until it is asked to end or must not go on. See CentreProgram::run().
    CentreProgram::End run();
    /// Any thread, at any time.
    void end() {
        isEnding_ = true;
        centre_->end();
    }
    const FleetDirectory& directory() const { return directory_; }
    /// Any thread.
    CentreProgram& centre() { return *centre_; }
    /// Like CentreProgram::ask(), with the roll-outs. Only while the centre works.
    template <typename Act>
    auto ask(Act act) -> std::future<decltype(act(std::declval<CentreDesk&>()))> {
        return centre_->ask([this, act = std::move(act)](CentreParts& parts) {
            if (!rollouts_) begin(parts);
            CentreDesk desk{parts, *rollouts_, *rolloutStore_, wallClock()};
            return act(desk);
        });
    }

private:
    CentreSettings settings(const ServiceOptions& options);
    ConnectionOptions busOptions() const;
    bool attend(CentreParts& parts, Moment now);
    bool endOrdersOfRevoked(CentreParts& parts);
    void begin(CentreParts& parts);

    const FleetDirectory directory_;
    const FleetFacts facts_;
    const CentreKey key_;
    TrustDatabase trust_;  ///< for the thread of run()
    std::vector<std::string> revoked_;
    std::int64_t endedFor_ = -1;  ///< the count of revocations whose hosts have no open orders
    std::unique_ptr<SqliteRolloutStore> rolloutStore_;
    std::unique_ptr<Rollouts> rollouts_;
    std::unique_ptr<CentreProgram> centre_;
    std::unique_ptr<AccountKeeper> accounts_;
    std::atomic<bool> isEnding_{false};
};

}  // namespace fleet
