/// Command lines of other programs inside one of this program.
#pragma once

#include <string>
#include <vector>

#include "ctl/verbs/verb.h"

namespace ctl {

/// The whole line, quoted for a shell, as it must be written when another program's command stands
/// in it without "--" and has options: this program would take them for its own. Empty when nothing
/// is wrong with the line. `words` are those behind this program's name.
std::string lineWithDashes(const Verb& verb, const std::vector<std::string>& words,
                           const ArgumentList& globals);

}  // namespace ctl
