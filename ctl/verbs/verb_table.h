/// All commands of the program. A new verb is a file of its own, its declaration and its row here.
#pragma once

#include <string_view>

#include "ctl/verbs/verb.h"
#include "ctl/verbs/vocabulary.h"

namespace ctl {

extern const Verb kStartVerb;
extern const Verb kStopVerb;
extern const Verb kRestartVerb;
extern const Verb kInstallVerb;
extern const Verb kCompleteInstallVerb;
extern const Verb kUninstallVerb;
extern const Verb kRemoveInstanceVerb;
extern const Verb kConfigGetVerb;
extern const Verb kConfigSetVerb;
extern const Verb kConfigEditVerb;
extern const Verb kUaConfigVerb;
extern const Verb kPushVerb;
extern const Verb kDepotLsVerb;
extern const Verb kDepotSumVerb;
extern const Verb kDepotRmVerb;
extern const Verb kQueryVerb;
extern const Verb kAgentsVerb;
extern const Verb kEventsVerb;
extern const Verb kStatusVerb;
extern const Verb kDoctorVerb;
extern const Verb kWhoamiVerb;
extern const Verb kTopVerb;
extern const Verb kConsoleVerb;
extern const Verb kPsVerb;
extern const Verb kTasksVerb;
extern const Verb kTaskShowVerb;
extern const Verb kTaskWaitVerb;
extern const Verb kTaskOutputVerb;
extern const Verb kTaskCancelVerb;
extern const Verb kVersionVerb;
extern const Verb kHelpVerb;

/// In the order of the help. Verbs of one group stand together.
constexpr const Verb* kVerbs[] = {
    &kStartVerb,            //
    &kStopVerb,             //
    &kRestartVerb,          //
    &kInstallVerb,          //
    &kCompleteInstallVerb,  //
    &kUninstallVerb,        //
    &kRemoveInstanceVerb,   //
    &kConfigGetVerb,        //
    &kConfigSetVerb,        //
    &kConfigEditVerb,       //
    &kUaConfigVerb,         //
    &kPushVerb,             //
    &kDepotLsVerb,          //
    &kDepotSumVerb,         //
    &kDepotRmVerb,          //
    &kQueryVerb,            //
    &kAgentsVerb,           //
    &kEventsVerb,           //
    &kStatusVerb,           //
    &kDoctorVerb,           //
    &kWhoamiVerb,           //
    &kTopVerb,              //
    &kConsoleVerb,          //
    &kPsVerb,               //
    &kTasksVerb,            //
    &kTaskShowVerb,         //
    &kTaskWaitVerb,         //
    &kTaskOutputVerb,       //
    &kTaskCancelVerb,       //
    &kVersionVerb,          //
    &kHelpVerb,
};

constexpr VerbGroup kVerbGroups[] = {
    {"config", "Read and change an agent's configuration"},
    {"depot", "Look into the depot and remove files from it"},
    {"task", "Look at a task, wait for it or cancel it"},
};

/// The words of zavctl, for one host.
const Vocabulary& hostVocabulary();

/// The verb of a full name such as "config get"; null if there is none.
const Verb* findVerb(std::string_view name);

/// The group of a name; null if there is none.
const VerbGroup* findVerbGroup(std::string_view name);

}  // namespace ctl
