/// What shells ask while somebody types a command line.
#pragma once

#include <string>
#include <vector>

#include "ctl/completion/wanted.h"

namespace ctl {

/// The first word behind the program's name of a line that only asks; no verb has such a name.
constexpr const char* kCompletionWord = "__complete";

/// The answer to the words behind that one, of which the last, which may be empty, is incomplete:
/// the line "files" when a file of this machine is wanted there; else "words" and a line for each
/// word that may stand there, with a tab and a few words about it behind if there are any. Asks the
/// host for two seconds at most. Where a verb or an option may stand, `verbs` and `options` may as
/// well: those of another part of the program.
std::string completionOf(const std::vector<std::string>& words,
                         const std::vector<Candidate>& verbs = {},
                         const std::vector<Candidate>& options = {});

/// The same by other words than those of one host. Nobody is asked: values are offered for files of
/// this machine only.
std::string completionBy(const Vocabulary& vocabulary, const std::vector<std::string>& words);

}  // namespace ctl
