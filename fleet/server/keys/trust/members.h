/// The hosts that are in the fleet, as administrators see them.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <utility>

#include "fleet/bus/messages/selector.h"
#include "sqlite/database.h"

namespace fleet {

struct Member {
    std::string name;
    std::string signing;  ///< the public key with which its link signs
    Labels labels;        ///< those that selectors mean
    Labels given;         ///< the centre's alone; the host's own may differ
};

/// By the hosts' bus keys.
using Members = std::map<std::string, Member>;

/// Works on a connection of a TrustDatabase, which outlives it. One thread at a time. Throws
/// sqlite::DatabaseError.
class MemberList {
public:
    explicit MemberList(sqlite::Database& database) : database_(database) {}

    /// All that have joined and were not revoked. Read anew only when the database has changed: ten
    /// thousand of them are asked for with each page of a list.
    std::shared_ptr<const Members> current();

    /// Gives a host other labels. False if it is not one of the fleet's.
    bool label(const std::string& host, const Labels& labels);

private:
    sqlite::Database& database_;
    std::pair<std::int64_t, std::int64_t> seen_{-1, -1};
    std::shared_ptr<const Members> members_;
};

}  // namespace fleet
