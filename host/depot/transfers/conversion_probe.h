/// Whether the plug-in can convert a file's line ends without losing the file.
#pragma once

#include <string>

namespace host {

/// The plug-in writes the converted text into the directory `temporaries`, removes the original
/// from the depot and links the text to its name. Tries the link with a file of its own, which it
/// removes. Returns why it fails; empty when it works.
std::string conversionProblem(const std::string& temporaries, const std::string& depot);

}  // namespace host
