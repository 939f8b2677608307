/// Manual pages: hand-written text in mdoc(7) with places for what the programs say of themselves.
#pragma once

#include <map>
#include <string>

namespace manual {

/// The text as it is, whatever of it means something in mdoc. Dashes stay dashes.
std::string escaped(const std::string& text);

/// Sentences as escaped lines of a page: each begins a new one. Line ends in `text` count as
/// blanks. Gives the text a capital letter and a full stop if it has none.
std::string sentences(const std::string& text);

/// One entry of a tagged list: ".It" with these macros, and the text as sentences.
std::string entry(const std::string& macros, const std::string& text);

/// What stands for "@NAME@". A line that holds nothing else disappears if there is nothing.
using Fillings = std::map<std::string, std::string>;

/// The template with all its places filled. Throws std::runtime_error when one has no filling, or
/// when the file cannot be read.
std::string filled(const std::string& templateFile, const Fillings& fillings);

/// The content of a file; empty if it is not there.
std::string contentIfThere(const std::string& file);

/// Throws std::runtime_error when it cannot be written.
void write(const std::string& file, const std::string& text);

}  // namespace manual
