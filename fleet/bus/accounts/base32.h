/// Base32 (RFC 4648) without padding, as the bus writes its keys.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace fleet {

std::string base32Encoded(std::string_view bytes);

/// The bytes; nothing if a character does not belong there or the text is not the one that
/// base32Encoded() gives for them: each key has one name only.
std::optional<std::string> base32Decoded(std::string_view text);

}  // namespace fleet
