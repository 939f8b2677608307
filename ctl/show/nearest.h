/// Which of the known words somebody may have meant.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace ctl {

/// The known word that `word` is most likely a slip of: letters left out, added, changed or
/// swapped, one for every three letters at most. Empty if there is none. Upper and lower case are
/// different.
std::string nearestWord(std::string_view word, const std::vector<std::string>& known);

/// "; did you mean \"agents\"?" or nothing.
std::string suggestion(std::string_view word, const std::vector<std::string>& known);

}  // namespace ctl
