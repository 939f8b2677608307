/// Words as they are typed into a shell.
#pragma once

#include <string>

namespace ctl {

/// A word as a shell takes it for one: as it is, or in single quotes.
std::string shellQuoted(const std::string& word);

}  // namespace ctl
