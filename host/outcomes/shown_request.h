/// What of a request may be shown and kept.
#pragma once

#include <string>
#include <utility>
#include <vector>

#include "embedded/oxa_host.h"

namespace host {

/// The columns that were asked with and their values; the last one of a column that was given more
/// than once, as the plug-in takes it. The text of a SETCONFIG is left out, passwords and the like
/// in other texts are masked, and long values are cut.
std::vector<std::pair<std::string, std::string>> shownRequest(
    const std::vector<oxa::Predicate>& conditions);

/// The value that the plug-in takes for this column; empty if there is none.
std::string valueIn(const std::vector<oxa::Predicate>& conditions, std::string_view column);

/// The same of the conditions. Returns whether there was a secret among them.
bool makeKeepable(std::vector<oxa::Predicate>& conditions);

}  // namespace host
