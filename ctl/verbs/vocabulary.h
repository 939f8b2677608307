/// The words that a program understands: its verbs, their groups, and the options of all of them.
#pragma once

#include <string_view>
#include <vector>

#include "ctl/verbs/verb.h"

namespace ctl {

/// Everything in it lives as long as the program.
struct Vocabulary {
    const char* purpose;  ///< what the program does; one line, no full stop
    ArgumentList globals;
    /// In the order of the help. Verbs of one group stand together.
    std::vector<const Verb*> verbs;
    std::vector<const VerbGroup*> groups;

    /// The verb of a full name such as "config get"; null if there is none.
    const Verb* findVerb(std::string_view name) const;
    /// The group of a name; null if there is none.
    const VerbGroup* findGroup(std::string_view name) const;
};

}  // namespace ctl
