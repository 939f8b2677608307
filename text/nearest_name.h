/// Finds the name that somebody probably meant.
#pragma once

#include <string>
#include <vector>

namespace text {

/// The known name that is closest to the given one, or "" when none is close: at most one typing
/// slip (a letter wrong, missing, too many, or two neighbours swapped) for every three letters, and
/// always one. Upper and lower case count as the same. Of equally close names the first counts.
std::string nearestName(const std::string& given, const std::vector<std::string>& known);

}  // namespace text
