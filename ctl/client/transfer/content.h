/// What the host's conversion of line ends would do to a file.
#pragma once

#include <string>

namespace ctl {

struct Content {
    bool changes = false;  ///< holds carriage returns or Ctrl-Z, which the conversion drops
    bool isText = true;    ///< holds no byte that text does not have
};

/// Reads the whole file. Throws Failure(kWrongUsage) when it cannot be read.
Content contentOf(const std::string& path);

/// The name with its parts that ask for a conversion put differently.
std::string unconvertedName(std::string name);

}  // namespace ctl
