/// Long lines, broken to fit a width.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace ctl {

/// The width that output for people fits into.
constexpr std::size_t kColumns = 80;

/// Places that a text takes on a terminal: characters, not bytes, and none for colours.
std::size_t widthOf(const std::string& text);

/// One line in pieces of at most `width` places, which is not 0. It is broken at blanks, which are
/// left out there; a word that is longer than that is broken where it must be.
std::vector<std::string> folded(const std::string& line, std::size_t width);

/// The same for a text of many lines. What continues a line is indented two places more than it.
std::string foldedText(const std::string& text, std::size_t width);

}  // namespace ctl
