/// From the words of the command line to the verb that they ask for.
#pragma once

#include <string>
#include <vector>

#include "ctl/show/page.h"
#include "ctl/verbs/arguments/values.h"
#include "ctl/verbs/verb.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {

/// What a command line means.
struct CommandLine {
    const Verb* verb = nullptr;  ///< null if there is nothing to run: `page` says it all then
    Values given;                ///< the values of the verb's arguments and of the global ones
    Page page;                   ///< the help that was asked for, or what is wrong
};

/// The verb that the words name, if that can be seen without parsing them; else null.
const Verb* namedVerb(const std::vector<std::string>& words,
                      const Vocabulary& vocabulary = hostVocabulary());

/// Takes the words behind the program's name apart. Nothing is run.
CommandLine parseCommandLine(const std::vector<std::string>& words,
                             const Vocabulary& vocabulary = hostVocabulary());

}  // namespace ctl
