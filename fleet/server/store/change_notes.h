/// What has changed in the centre's database since somebody looked.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "fleet/bus/messages/values.h"
#include "sqlite/database.h"

namespace fleet {

/// An order that was given, or has got an outcome.
struct ChangedOrder {
    std::string host;  ///< its bus key
    std::string order;
    EndState end;         ///< how it ended; "" before that
    std::string rollout;  ///< the roll-out that it belongs to; "" if it is part of none
    // What it does: of the roll-out, or else to be read from the bytes.
    std::string kind;
    std::string product;
    std::string bytes;  ///< as published
};

struct Changes {
    std::vector<std::string> hosts;  ///< bus keys of those whose records changed
    std::vector<std::string> facts;  ///< of those that have told something about themselves
    std::vector<ChangedOrder> orders;
    std::vector<std::string> rollouts;  ///< identifiers
    bool isMore = false;                ///< there were more than asked for
};

/// Triggers note what changes, whoever changes it, within the transaction of the change, and so
/// what is taken back was never noted. A row that changes often between two looks is noted once.
/// The notes are the connection's own and in no file.
///
/// Works on a connection of a CentreDatabase, which outlives it. Throws sqlite::DatabaseError.
class ChangeNotes {
public:
    /// From now on changes are noted, unless they were before.
    explicit ChangeNotes(sqlite::Database& database);

    /// At most so many of each kind. They are forgotten with the transaction that this is part of.
    Changes take(std::size_t most);

private:
    std::vector<std::string> takeNames(const char* table, const char* select, std::size_t most);
    std::vector<ChangedOrder> takeOrders(std::size_t most);
    void forget(const char* table, std::int64_t upTo);

    sqlite::Database& database_;
};

}  // namespace fleet
