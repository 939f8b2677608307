/// What hosts have told about themselves, the newest of each.
#pragma once

#include <map>
#include <optional>
#include <string>

#include "fleet/bus/messages/facts.h"
#include "sqlite/database.h"

namespace fleet {

/// Facts, and when they came.
struct KeptFacts {
    Facts facts;
    Moment heard{};  ///< by the centre's clock
};

/// Works on a connection of a CentreDatabase, which outlives it. Throws sqlite::DatabaseError.
class HostFacts {
public:
    explicit HostFacts(sqlite::Database& database) : database_(database) {}

    /// Keeps them instead of what the host has told before. False, and nothing changes, if those
    /// are as new or newer, or there is no such host.
    bool keep(const Facts& facts, Moment heard);
    std::optional<KeptFacts> of(const std::string& host) const;
    /// The labels of all hosts that have told some, by their bus keys.
    std::map<std::string, Labels> labels() const;

private:
    sqlite::Database& database_;
};

}  // namespace fleet
