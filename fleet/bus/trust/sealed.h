/// Texts that only one host or one operator can read.
#pragma once

#include <string>
#include <string_view>

namespace fleet {

/// The text, for the holder of the public key only, who opens it with KeyPair::unseal(). Each time
/// other bytes, 48 more than the text has. Throws std::invalid_argument if the key is none.
std::string sealFor(std::string_view publicKey, std::string_view text);

}  // namespace fleet
