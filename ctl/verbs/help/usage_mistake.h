/// What is wrong with a command line whose words could be taken apart.
#pragma once

#include <string>
#include <vector>

#include "ctl/verbs/arguments/values.h"
#include "ctl/verbs/vocabulary.h"

namespace ctl {

/// The command that a line names, as far as it names one.
struct NamedCommand {
    const Verb* verb = nullptr;
    const VerbGroup* group = nullptr;  ///< of the verb, or the one that the words stop at
    std::string name;                  ///< the words that are, or should be, its name
};

/// What the words of a line were taken for.
struct TakenWords {
    const std::vector<std::string>& words;     ///< all, in their order
    const std::vector<std::string>& leftOver;  ///< those that stand for nothing, in no order
    const Values& given;
};

/// A sentence about the first mistake, without a full stop; empty if there is none. A command that
/// is unknown comes first, then unknown words, missing arguments, and those that do not go
/// together.
std::string firstMistake(const NamedCommand& named, const TakenWords& taken,
                         const Vocabulary& vocabulary);

}  // namespace ctl
