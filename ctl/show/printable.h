/// Text from elsewhere, made fit for a terminal.
#pragma once

#include <string>

namespace ctl {

/// The text with its control characters shown as \xNN, those of the upper half of Latin-1 too: a
/// terminal may take them for the start of a command.
std::string printable(const std::string& text);

/// The same with "***" in the place of passwords and the like: for command lines, for what they
/// wrote and for the host's words, which may repeat them. Not for names that somebody will copy.
std::string redacted(const std::string& text);

/// printable() for a text of several lines: line ends and tabs stay.
std::string printableLines(const std::string& text);

/// JSON with the control characters that JSON itself allows, in its strings, as \u00NN.
std::string withoutTerminalControls(const std::string& json);

}  // namespace ctl
