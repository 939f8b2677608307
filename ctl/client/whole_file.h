/// Files read and written as a whole.
#pragma once

#include <string>

namespace ctl {

/// A file's content. Throws Failure(kWrongUsage) when it cannot be read.
std::string readFile(const std::string& path);

/// The same of an open descriptor, up to its end; `name` is for the failure.
std::string readDescriptor(int descriptor, const std::string& name);

/// Writes all of a text; false when that fails.
bool writeDescriptor(int descriptor, const std::string& text);

}  // namespace ctl
