/// What may stand at the end of a command line that is not complete yet, by the declarations of the
/// verbs.
#pragma once

#include <string>
#include <vector>

#include "ctl/client/address/host_address.h"
#include "ctl/verbs/arguments/argument.h"
#include "ctl/verbs/verb_table.h"

namespace ctl {

/// A word that may stand there.
struct Candidate {
    std::string word;
    std::string help;  ///< a few words; may be empty
};

struct Wanted {
    std::string typed;  ///< of the value, as far as it stands there
    std::string lead;   ///< what stands before it in the same word: "--target="
    /// Where values come from.
    Completion source = Completion::Nothing;
    std::vector<Candidate> words;  ///< verbs or options that fit what is typed
    bool isVerb = false;           ///< the first word of a verb's name, or its only one
    bool isOption = false;         ///< an option's name
    std::string product;           ///< that the line names; "" if none
    HostAddress host;              ///< by the line's options and the environment
    std::string hostUser;          ///< whom --host-user trusts; "" if nobody
};

/// Of the words behind the program's name, of which the last, which may be empty, is incomplete.
Wanted wantedBy(const std::vector<std::string>& words,
                const Vocabulary& vocabulary = hostVocabulary());

}  // namespace ctl
