/// SHA-256.
#pragma once

#include <cstdint>
#include <string>

namespace host {

struct Checksum {
    std::string sha256;  ///< 64 lower-case hexadecimal digits
    std::uint64_t bytes = 0;
};

/// The checksum of everything that an open file still gives. Throws std::system_error when it
/// cannot be read.
Checksum checksumOf(int descriptor);

}  // namespace host
