#include "fleet/operator/verbs/one_hosts_verbs.h"

#include <algorithm>
#include <iterator>

#include "ctl/command_line.h"
#include "ctl/verbs/verb_table.h"
#include "fleet/operator/verbs/fleet_arguments.h"
#include "fleet/operator/verbs/fleet_verbs.h"

namespace fleet {
namespace {

struct OneHostsVerb {
    const char* name;
    const char* instead;  ///< in a fleet
};

constexpr OneHostsVerb kInstead[] = {
    {"complete-install", "zavctl rollout show ID tells how an install ended on each host."},
    {"config edit", "zavctl config get --on and config set --on read and write it."},
    {"depot ls", "zavctl push --on brings files; what an order needs is checked on each host."},
    {"depot sum", "zavctl push --on brings files; what an order needs is checked on each host."},
    {"depot rm", "On a host, zavctl depot rm removes what is no longer needed there."},
    {"query", "zavctl agents --on, tasks --on and config get --on tell what the tables hold."},
    {"events", "zavctl rollout watch ID and task output -f ID follow what happens."},
    {"status", "zavctl hosts show NAME tells how a host is, and doctor --on what is wrong."},
    {"top", "zavctl console shows the fleet at a glance."},
    {"ps", "zavctl tasks --on SELECTOR --state running lists what runs."},
    {"task show", "zavctl tasks --on SELECTOR lists tasks, and hosts show NAME orders."},
    {"task wait", "zavctl rollout watch ID waits for the end of orders."},
    {"task cancel", "zavctl rollout abort ID cancels what hosts have not done yet."},
};

/// All verbs of one host with the options of a fleet.
const ctl::Vocabulary& oneHostsVocabulary() {
    static const ctl::Vocabulary vocabulary{ctl::hostVocabulary().purpose, kFleetArguments,
                                            ctl::hostVocabulary().verbs,
                                            ctl::hostVocabulary().groups};
    return vocabulary;
}

}  // namespace

std::optional<ctl::Failure> refusalOfOneHostsVerb(const std::vector<std::string>& words) {
    const ctl::Verb* const verb = ctl::namedVerb(words, oneHostsVocabulary());
    if (verb == nullptr || fleetVocabulary().findVerb(verb->name) != nullptr) return std::nullopt;
    const auto row = std::find_if(
        std::begin(kInstead), std::end(kInstead),
        [verb](const OneHostsVerb& one) { return std::string(verb->name) == one.name; });
    return ctl::Failure(ctl::kWrongUsage, std::string(verb->name) + " is for one host at a time",
                        row == std::end(kInstead) ? "" : row->instead);
}

}  // namespace fleet
