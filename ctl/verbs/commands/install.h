/// install: a product from the depot, also one that restarts the host.
#pragma once

#include <string>
#include <vector>

namespace ctl {

/// The words as one command line, which the host splits at blanks outside quotes. A word with
/// blanks gets quotes; a word that contains quotes is kept as it is. A single word is a whole
/// command line.
std::string joinedCommand(const std::vector<std::string>& words);

}  // namespace ctl
