/// Text from elsewhere, made fit for a terminal.
#pragma once

#include <string>

namespace ctl {

/// The text with its control characters shown as \xNN.
std::string printable(const std::string& text);

}  // namespace ctl
