/// The hosts that an operator means.
#pragma once

#include <string>
#include <vector>

#include "fleet/operator/centre/centre.h"

namespace fleet {

struct ChosenHost {
    std::string key;           ///< the bus key: what orders call it, and what texts are sealed for
    std::string name;          ///< for people
    std::string state;         ///< "here", "away", "stopped" or "unknown"
    std::string signing = {};  ///< the public key with which its link signs
};

/// A choice of hosts, and how the orders for them say it.
struct Choice {
    /// What each order's own selector is: the link tries it on the labels of the host's own
    /// configuration, whatever the centre thinks of those.
    std::string selector;
    std::vector<ChosenHost> hosts;  ///< in the order of their keys, or of the file
};

/// The documents of all hosts with that selector, page by page. Throws ctl::Failure.
nlohmann::json hostDocuments(Centre& centre, const std::string& selector);

/// The documents of the hosts of a selector, or of "@FILE", with what they have told about
/// themselves. Throws ctl::Failure as chooseHosts() does.
nlohmann::json inventoryDocuments(Centre& centre, const std::string& selector);

/// A host as its document tells. Throws ctl::Failure if that has no key of a host.
ChosenHost hostOf(const nlohmann::json& document);

/// The hosts of a selector, or of "@FILE", which has a name or a key on each line. Throws
/// ctl::Failure if there are none, if a line of the file is no host's, or as the centre does.
Choice chooseHosts(Centre& centre, const std::string& selector);

}  // namespace fleet
