/// Texts that only one host or one operator can read.
#pragma once

#include <string>
#include <string_view>

namespace fleet {

/// Whether a text can be sealed for it. Not every text with a right check sum is a key.
bool canSealFor(std::string_view publicKey);

/// The text, for the holder of the public key only, who opens it with KeyPair::unseal(). Each time
/// other bytes, 48 more than the text has. Throws std::invalid_argument if that cannot be
/// done.
std::string sealFor(std::string_view publicKey, std::string_view text);

}  // namespace fleet
