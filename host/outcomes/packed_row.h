/// A row in little memory: most of a row is blanks.
#pragma once

#include <string>
#include <string_view>

namespace host {

/// The row with each long run of blanks replaced by its length. Any bytes may stand in it.
std::string packRow(std::string_view row);

/// The row that was packed.
std::string unpackRow(std::string_view packed);

}  // namespace host
