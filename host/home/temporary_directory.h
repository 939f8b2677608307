/// Where the plug-in converts the texts that are pushed.
#pragma once

#include <string>

namespace host {

/// The directory of the plug-in's temporary file.
std::string temporaryDirectoryOf(const std::string& home);

/// Makes that directory, for the host's user alone, if it is missing: the plug-in does not, and
/// then fails to store a pushed script. Throws StartError when it cannot be made.
void provideTemporaryDirectory(const std::string& home);

}  // namespace host
