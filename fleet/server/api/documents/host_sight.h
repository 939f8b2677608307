/// A host as operators see it.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <optional>
#include <string>
#include <vector>

#include "fleet/server/api/visit.h"
#include "fleet/server/core/records.h"
#include "fleet/server/program/centre_program.h"
#include "fleet/server/store/host_facts.h"

namespace fleet {

/// What is known of a host, from both databases and from its last hello.
struct HostSight {
    std::string host;
    Member member;
    std::optional<HostRecord> record;
    std::optional<HostNews> news;
    std::optional<KeptFacts> facts;  ///< if they were asked for
};

/// The state of a host that was last heard then, or never if that is 0, and whose link must not go
/// on for this reason, if there is one.
const char* hostState(Moment heard, const std::string& stopped, Moment now);

/// Whether the visitor may see a host of the fleet.
bool maySee(const Visit& visit, const Member& member);

/// The bus key of a host that the visitor may see, by its name or its key. Throws NothingThere.
std::string hostNamed(const Visit& visit, const Members& members, const std::string& nameOrKey);

/// The hosts behind `after` that the visitor means and may see, one more than wanted.
std::vector<std::string> hostsMeant(const Visit& visit, const Members& members,
                                    const std::string& selector, const std::string& after,
                                    std::size_t most);

/// Whether sights are to have what the hosts have told about themselves, 63 KiB each at most.
enum class WithFacts { No, Yes };

/// What is known of these members. Throws Unavailable.
std::vector<HostSight> sightsOf(const Visit& visit, const Members& members,
                                const std::vector<std::string>& hosts,
                                WithFacts withFacts = WithFacts::No);

nlohmann::json hostDocument(const HostSight& sight, Moment now);

/// A time as documents have it.
std::string timeOfDocument(Moment time);

}  // namespace fleet
