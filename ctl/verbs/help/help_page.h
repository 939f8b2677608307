/// The help for the program, its groups and its verbs, made from their declarations.
#pragma once

#include <string>

#include "ctl/verbs/verb.h"

namespace ctl {

/// What the program is, its commands and the options of all of them.
std::string programHelp();

/// The commands of a group.
std::string groupHelp(const VerbGroup& group);

/// A command's arguments, its options, those of every command, and its examples.
std::string verbHelp(const Verb& verb);

}  // namespace ctl
