/// What only one browser shall know.
#pragma once

#include <string>
#include <string_view>

namespace console {

/// 256 bits from the kernel as 64 lower-case hexadecimal digits. Throws std::runtime_error if the
/// kernel gives none.
std::string newSecret();

/// Whether the text has the form of a secret.
bool isSecretText(std::string_view text);

/// Whether both are equal, in a time that tells nothing about where they differ.
bool isSameSecret(std::string_view one, std::string_view other);

}  // namespace console
