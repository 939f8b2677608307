#include "fleet/operator/verbs/fleet_verbs.h"

#include "ctl/verbs/verb_table.h"
#include "fleet/operator/verbs/fleet_arguments.h"

namespace fleet {
namespace {

constexpr ctl::VerbGroup kFleetGroups[] = {
    {"hosts", "List the hosts of a fleet, show, label or retire one"},
    {"rollout", "Look at roll-outs, stop them, and let them go on"},
    {"config", "Compare and change an agent's configuration on many hosts"},
    {"task", "Look at a task of a host"},
};

}  // namespace

const ctl::Vocabulary& fleetVocabulary() {
    static const ctl::Vocabulary vocabulary{
        "Manages the monitoring agents of many hosts: a fleet",
        kFleetArguments,
        {&ctl::kStartVerb,         &ctl::kStopVerb,       &ctl::kRestartVerb,
         &ctl::kInstallVerb,       &ctl::kUninstallVerb,  &ctl::kRemoveInstanceVerb,
         &kFleetConfigGetVerb,     &ctl::kConfigSetVerb,  &ctl::kUaConfigVerb,
         &kFleetPushVerb,          &kFleetAgentsVerb,     &kFleetDoctorVerb,
         &kFleetTasksVerb,         &kFleetTaskOutputVerb, &kHostsVerb,
         &kHostsShowVerb,          &kHostsLabelVerb,      &kHostsRetireVerb,
         &kRolloutLsVerb,          &kRolloutShowVerb,     &kRolloutWatchVerb,
         &kRolloutPauseVerb,       &kRolloutResumeVerb,   &kRolloutAbortVerb,
         &kRolloutRetryFailedVerb, &kLoginVerb,           &kFleetWhoamiVerb,
         &kFleetConsoleVerb,       &kFleetVersionVerb,    &kFleetHelpVerb},
        {&kFleetGroups[0], &kFleetGroups[1], &kFleetGroups[2], &kFleetGroups[3]}};
    return vocabulary;
}

}  // namespace fleet
