// help: how the program, or one of its verbs, is used.

#include <string>
#include <vector>

#include "ctl/client/failure.h"
#include "ctl/show/nearest.h"
#include "ctl/show/printable.h"
#include "ctl/verbs/help/help_page.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {
namespace {

constexpr Argument kVerb =
    positionals("VERB", "What to explain; without it the program").completedBy(Completion::Verb);
constexpr Argument kArguments[] = {kVerb};

std::string askHelp(const std::vector<std::string>& words) {
    std::string name;
    for (const std::string& word : words)
        name += (name.empty() ? "" : " ") + word;
    if (name.empty()) return programHelp();
    if (const Verb* const verb = findVerb(name)) return verbHelp(*verb);
    if (const VerbGroup* const group = findVerbGroup(name)) return groupHelp(*group);
    std::vector<std::string> known;
    for (const Verb* const verb : kVerbs)
        known.emplace_back(verb->name);
    throw Failure(kWrongUsage,
                  "there is no command \"" + printable(name) + "\"" + suggestion(name, known));
}

ExitStatus run(const Invocation& invocation) {
    return print({askHelp(invocation.given.texts(kVerb)), {}});
}

}  // namespace

constexpr Verb kHelpVerb = {
    "help", "Explain a command", kArguments, {"zavctl help install", "zavctl help config set"}, run,
};

}  // namespace ctl
