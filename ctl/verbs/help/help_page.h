/// The help for the program, its groups and its verbs, made from their declarations.
#pragma once

#include <string>
#include <vector>

#include "ctl/verbs/verb_table.h"

namespace ctl {

/// What the program is, its commands and the options of all of them.
std::string programHelp(const Vocabulary& vocabulary = hostVocabulary());

/// The commands of a group.
std::string groupHelp(const VerbGroup& group, const Vocabulary& vocabulary = hostVocabulary());

/// A command's arguments, its options, those of every command, and its examples.
std::string verbHelp(const Verb& verb, const Vocabulary& vocabulary = hostVocabulary());

/// The page about what the words name: a verb, a group, or the program if there are none. Throws
/// Failure(kWrongUsage) if there is no such command.
std::string helpAbout(const std::vector<std::string>& words,
                      const Vocabulary& vocabulary = hostVocabulary());

}  // namespace ctl
