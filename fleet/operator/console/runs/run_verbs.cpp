#include "fleet/operator/console/runs/run_verbs.h"

#include <algorithm>
#include <iterator>

#include "ctl/verbs/arguments/common_arguments.h"
#include "fleet/operator/verbs/fleet_arguments.h"
#include "fleet/operator/verbs/fleet_verbs.h"

namespace fleet {
namespace {

constexpr RunVerb kRunVerbs[] = {
    {"start"},
    {"stop"},
    {"restart"},
    {"install"},
    {"uninstall"},
    {"remove-instance"},
    {"config set", true},
    {"config get"},
    {"agents"},
    {"tasks"},
    {"rollout pause"},
    {"rollout resume"},
    {"rollout abort"},
    {"rollout retry-failed"},
    {"hosts label"},
};

/// The console says these for each verb.
constexpr const ctl::Argument* kOwnOptions[] = {&kFleet, &ctl::kJson, &kFleetTimeout,
                                                &ctl::kNoWait};

bool isOwn(const ctl::Argument& argument) {
    return std::any_of(std::begin(kOwnOptions), std::end(kOwnOptions),
                       [&argument](const ctl::Argument* own) {
                           return std::string_view(own->name) == argument.name;
                       });
}

bool isForBrowsers(const ctl::Argument& argument) {
    return argument.kind != ctl::Argument::Kind::Positional && !argument.isHidden &&
           argument.completion != ctl::Completion::LocalFile && !isOwn(argument);
}

}  // namespace

const RunVerb* findRunVerb(std::string_view name) {
    const auto* const found =
        std::find_if(std::begin(kRunVerbs), std::end(kRunVerbs),
                     [name](const RunVerb& verb) { return verb.name == name; });
    return found == std::end(kRunVerbs) ? nullptr : found;
}

const ctl::Verb& declarationOf(const RunVerb& verb) {
    return *fleetVocabulary().findVerb(verb.name);
}

const ctl::Argument* findRunOption(const ctl::Verb& verb, std::string_view name) {
    constexpr std::string_view kDashes = "--";
    for (const ctl::ArgumentList& arguments : {kFleetArguments, verb.arguments}) {
        for (const ctl::Argument& argument : arguments) {
            const std::string_view option = argument.name;
            const bool isIt = option.substr(0, kDashes.size()) == kDashes &&
                              option.substr(kDashes.size()) == name;
            if (isIt) return isForBrowsers(argument) ? &argument : nullptr;
        }
    }
    return nullptr;
}

}  // namespace fleet
