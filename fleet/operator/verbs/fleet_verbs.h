/// All commands for a fleet. A new verb is a file of its own, its declaration and its row here.
#pragma once

#include "ctl/verbs/vocabulary.h"

namespace fleet {

extern const ctl::Verb kLoginVerb;
extern const ctl::Verb kFleetWhoamiVerb;
extern const ctl::Verb kFleetPushVerb;
extern const ctl::Verb kFleetAgentsVerb;
extern const ctl::Verb kFleetTasksVerb;
extern const ctl::Verb kFleetTaskOutputVerb;
extern const ctl::Verb kFleetDoctorVerb;
extern const ctl::Verb kFleetConfigGetVerb;
extern const ctl::Verb kHostsVerb;
extern const ctl::Verb kHostsShowVerb;
extern const ctl::Verb kHostsLabelVerb;
extern const ctl::Verb kHostsRetireVerb;
extern const ctl::Verb kRolloutLsVerb;
extern const ctl::Verb kRolloutShowVerb;
extern const ctl::Verb kRolloutWatchVerb;
extern const ctl::Verb kRolloutPauseVerb;
extern const ctl::Verb kRolloutResumeVerb;
extern const ctl::Verb kRolloutAbortVerb;
extern const ctl::Verb kRolloutRetryFailedVerb;
extern const ctl::Verb kFleetConsoleVerb;
extern const ctl::Verb kFleetVersionVerb;
extern const ctl::Verb kFleetHelpVerb;

/// These, and those of one host that work on many.
const ctl::Vocabulary& fleetVocabulary();

}  // namespace fleet
