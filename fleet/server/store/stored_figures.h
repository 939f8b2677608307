/// What the centre's database tells whoever watches the fleet.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "fleet/server/rollouts/rollout_records.h"
#include "sqlite/database.h"

namespace fleet {

struct StoredFigures {
    /// A host as its hellos have left it.
    struct SeenHost {
        std::string host;  ///< its bus key
        Moment heard{};    ///< 0: never
        bool isStopped = false;
        bool isHeld = false;  ///< nothing is published for it
    };
    std::vector<SeenHost> hosts;
    std::uint64_t waiting = 0;      ///< orders with a number that are not on the bus yet
    std::uint64_t open = 0;         ///< orders with a number and without an outcome
    std::uint64_t unconfirmed = 0;  ///< of roll-outs: out of date, and no host has told their end
    std::map<RolloutState, std::uint64_t> rollouts;
    std::map<PauseCause, std::uint64_t> paused;
};

// None of them may go through all orders, nor through all parts of all roll-outs.
inline constexpr const char* kSeenHosts =
    "SELECT host, heard, stopped != x'', unpublished != x'' FROM hosts";
inline constexpr const char* kCountWaiting =
    "SELECT count(*) FROM orders INDEXED BY orders_waiting"
    " WHERE published = 0 AND held = 0 AND state IS NULL AND number > 0";
inline constexpr const char* kCountOpen =
    "SELECT count(*) FROM orders INDEXED BY orders_open WHERE state IS NULL AND host > 0";
inline constexpr const char* kCountUnconfirmed =
    "SELECT count(*) FROM rollouts r CROSS JOIN rollout_parts p INDEXED BY rollout_parts_by_state"
    " ON p.rollout = r.id AND p.state = 1 WHERE p.expires < ?";
inline constexpr const char* kCountRollouts =
    "SELECT state, cause, count(*) FROM rollouts GROUP BY state, cause";

/// Reads beside the centre, on a connection of its own: a scrape waits for no order and holds none
/// up. Any thread.
class StoredFiguresReader {
public:
    /// The database in this directory; see CentreDatabase, which has made it.
    explicit StoredFiguresReader(const std::string& directory);

    /// As they were committed last. Throws sqlite::DatabaseError.
    StoredFigures read(Moment now);

private:
    const std::string file_;
    std::mutex mutex_;
    std::unique_ptr<sqlite::Database> connection_;  ///< opened with the first look
};

}  // namespace fleet
