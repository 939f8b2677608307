/// What a command line that CLI11 reads says of itself, as parts of manual pages.
#pragma once

#include <string>

namespace CLI {
class App;
}

namespace manual {

/// The options of a command, its arguments among them, as one tagged list; "" if it has none.
/// --help is left out.
std::string optionList(const CLI::App& app);

/// The command's line in a synopsis: the macros behind ".Nm".
std::string synopsisOf(const CLI::App& app);

}  // namespace manual
