/// Where a path really is.
#pragma once

#include <string>

namespace host {

/// The path of an open file without links; empty when the kernel does not say.
std::string pathOfDescriptor(int descriptor);

/// The path without links, however much of it exists: what is missing is taken as it stands. Empty
/// when it cannot be told.
std::string realPath(const std::string& path);

/// Whether `path` is `directory` or below it. Both are real paths.
bool isWithin(const std::string& path, const std::string& directory);

}  // namespace host
