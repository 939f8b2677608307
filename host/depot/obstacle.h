/// What keeps a file from being written in the depot.
#pragma once

#include <string>

namespace host {

/// Why no file can be made or replaced at `path`, relative to the directory `depot`, as things are
/// there now; empty when nothing stands in the way, or the depot cannot be opened. The words are a
/// sentence's. Whether the path leads out is not looked at. Changes nothing; any thread.
std::string obstacleAt(const std::string& depot, const std::string& path);

}  // namespace host
