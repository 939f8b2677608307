// help: how the program, or one of its verbs, is used.

#include "ctl/verbs/help/help_page.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

constexpr Argument kVerb =
    positionals("VERB", "What to explain; without it the program").completedBy(Completion::Verb);
constexpr Argument kArguments[] = {kVerb};

ExitStatus run(const Invocation& invocation) {
    return print({helpAbout(invocation.given.texts(kVerb)), {}});
}

}  // namespace

constexpr Verb kHelpVerb = {
    "help", "Explain a command", kArguments, {"zavctl help install", "zavctl help config set"}, run,
};

}  // namespace ctl
