/// SHA-256, by which files are named.
#pragma once

#include <array>
#include <cstddef>
#include <string>
#include <string_view>

namespace fleet {

/// Whether a text can be a sum: 64 hexadecimal digits in lower case.
bool isChecksum(std::string_view text);

/// Computes the sum of what is added.
class Checksum {
public:
    /// Throws std::runtime_error if libsodium cannot be used.
    Checksum();

    void add(std::string_view bytes);
    /// 64 hexadecimal digits in lower case. Once, at the end.
    std::string hex();

private:
    static constexpr std::size_t kStateBytes = 128;
    alignas(16) std::array<unsigned char, kStateBytes> state_{};
};

/// Of a file that was opened for reading, from its beginning. Throws std::system_error.
std::string checksumOfFile(int descriptor);

}  // namespace fleet
