/// What is left of a secret, so that the same one is recognised.
#pragma once

#include <string>
#include <string_view>

namespace host {

/// 16 bytes that nobody can make or undo without the key of 32 bytes: SipHash-2-4 twice, with one
/// half of the key each.
std::string keyedHash(std::string_view key, std::string_view text);

}  // namespace host
