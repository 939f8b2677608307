/// How much of a text the plug-in loses where it turns its UTF-16 units into bytes.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

#include "host/tables/code_page.h"

namespace host {

/// The number of UTF-16 units of a text in UTF-8, which is what the plug-in counts as characters.
std::size_t utf16Units(std::string_view utf8);

/// How many bytes a text of the code page has beyond one for each of its UTF-16 units.
std::size_t bytesBeyondUnits(const std::string& text, const CodePage& codePage);

/// How many bytes of the text's end are cut: on its way into a command line, a path or a child's
/// standard input it gets room for one byte per UTF-16 unit and one more.
std::size_t bytesCut(const std::string& text, const CodePage& codePage);

}  // namespace host
