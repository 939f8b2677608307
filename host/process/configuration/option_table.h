/// The options of the host, as the command line and the configuration file know them.
#pragma once

#include <string>
#include <vector>

namespace host {

enum class OptionKind { Text, Number, Flag };

/// Where an option may stand.
enum class OptionPlace { Anywhere, CommandLineOnly };

/// One option.
struct OptionRow {
    const char* name;  ///< without the dashes of the command line
    OptionKind kind;
    const char* value;  ///< the word for its value; null for a flag
    const char* help;
    OptionPlace place = OptionPlace::Anywhere;
};

/// All of them, in the order of the help.
const std::vector<OptionRow>& optionTable();

/// The option of that name, or null.
const OptionRow* findOption(const std::string& name);

}  // namespace host
