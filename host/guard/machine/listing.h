/// What a directory holds, for refusals.
#pragma once

#include <string>
#include <vector>

namespace host {

/// The folders below a directory that hold no other folder within that many levels, relative to it
/// and sorted. Links are not followed. At most a few thousand entries are looked at.
std::vector<std::string> foldersIn(const std::string& directory, int levels);

/// The files of a directory, sorted; likewise.
std::vector<std::string> filesIn(const std::string& directory);

}  // namespace host
