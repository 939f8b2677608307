/// Which changes of hosts are told to those who watch the fleet.
#pragma once

#include <map>
#include <optional>
#include <string>
#include <vector>

#include "fleet/bus/messages/values.h"
#include "fleet/server/keys/trust/members.h"

namespace fleet {

/// What counts of a host.
struct HostFace {
    std::string name;
    Labels labels;
    Moment heard{};  ///< the latest hello; 0 before the first one
    std::string stopped;
    std::string blocked;
};

/// What is told of it.
struct HostChange {
    std::string host;  ///< its bus key
    HostFace face;
    std::string state;  ///< as hostState() names it, or "retired"
    /// When it came into that state; of one that is away, when it was last heard.
    Moment since{};
};

/// Decides without a clock. One thread at a time.
class WatchedHosts {
public:
    /// Takes what is known of a host now. Returns what is to be told: it is new, or something else
    /// about it than when it was heard has changed, or it has told something about itself.
    std::optional<HostChange> note(const std::string& host, const HostFace& face, bool hasTold,
                                   Moment now);
    /// Those that have not been heard for too long since the last look.
    std::vector<HostChange> goneAway(Moment now);
    /// Those that are members no longer, which are forgotten.
    std::vector<HostChange> retired(const Members& members, Moment now);
    /// The members that are new here, or have another name or other labels.
    std::vector<std::string> changedMembers(const Members& members) const;

private:
    struct Known {
        HostFace face;
        std::string state;
        Moment since{};
    };
    std::map<std::string, Known> hosts_;
};

}  // namespace fleet
