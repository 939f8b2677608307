/// What a program that writes manual pages is made of, beside its main().
#pragma once

#include <string>

namespace manual {

/// Writes the program's pages into a directory, from the templates in another one. The date is that
/// of the pages. Throws std::exception when it cannot. Each program has its own.
void writePages(const std::string& templates, const std::string& directory,
                const std::string& date);

}  // namespace manual
