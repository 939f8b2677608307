/// What the centre's database says, read beside the centre, whatever state that is in.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "fleet/bus/messages/values.h"
#include "fleet/server/keys/directory/fleet_directory.h"
#include "sqlite/database.h"

namespace fleet_programs {

/// The order of one host in a roll-out.
struct RolledOut {
    std::string host;     ///< its bus key
    std::string product;  ///< the roll-out's
    std::string order;    ///< its identifier
    std::int64_t number = 0;
    std::string partState;   ///< how it ended, as the roll-out has it; "" before that
    std::string orderState;  ///< the same, as it stands among the orders
    std::string journal;     ///< the host's, that has it
};

/// One thread at a time. Throws sqlite::DatabaseError while there is no such database.
class CentreRecords {
public:
    explicit CentreRecords(const fleet::FleetDirectory& directory);

    std::int64_t hosts();
    /// Hosts of which a hello came then or later.
    std::int64_t heardSince(fleet::Moment then);
    /// Hosts that have told facts.
    std::int64_t withFacts();
    /// Orders with an outcome, and without one.
    struct Orders {
        std::int64_t over = 0;
        std::int64_t open = 0;
    };
    Orders orders();
    std::int64_t rollouts();
    std::int64_t finishedRollouts();
    /// When the newest roll-out was made.
    fleet::Moment newestRollout();
    /// All of all roll-outs, in the order of hosts and numbers.
    std::vector<RolledOut> rolledOut();

private:
    sqlite::Database database_;
};

}  // namespace fleet_programs
