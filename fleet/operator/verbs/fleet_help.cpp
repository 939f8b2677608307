// help: how the program, or one of its verbs, is used.

#include "ctl/show/page.h"
#include "ctl/verbs/help/help_page.h"
#include "ctl/verbs/invocation.h"
#include "fleet/operator/verbs/fleet_verbs.h"

namespace fleet {
namespace {

constexpr ctl::Argument kHelpWords =
    ctl::positionals("VERB", "What to explain; without it the program");
constexpr ctl::Argument kHelpArguments[] = {kHelpWords};

ctl::ExitStatus runHelp(const ctl::Invocation& invocation) {
    return ctl::print({ctl::helpAbout(invocation.given.texts(kHelpWords), fleetVocabulary()), {}});
}

}  // namespace

constexpr ctl::Verb kFleetHelpVerb = {
    "help",         "Explain a command",
    kHelpArguments, {"zavctl help rollout", "zavctl --fleet https://centre.example help start"},
    runHelp,
};

}  // namespace fleet
