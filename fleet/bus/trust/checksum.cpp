#include "fleet/bus/trust/checksum.h"

#include <sodium.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <new>
#include <stdexcept>
#include <system_error>
#include <vector>

namespace fleet {
namespace {

constexpr std::size_t kChecksumDigits = std::size_t{2} * crypto_hash_sha256_BYTES;
constexpr std::size_t kPieceBytes = std::size_t{256} * 1024;

}  // namespace

bool isChecksum(std::string_view text) {
    return text.size() == kChecksumDigits && std::all_of(text.begin(), text.end(), [](char c) {
               return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f');
           });
}

Checksum::Checksum() {
    static_assert(sizeof(crypto_hash_sha256_state) <= kStateBytes);
    if (sodium_init() < 0) throw std::runtime_error("libsodium cannot be used");
    crypto_hash_sha256_init(new (state_.data()) crypto_hash_sha256_state);
}

void Checksum::add(std::string_view bytes) {
    crypto_hash_sha256_update(
        std::launder(reinterpret_cast<crypto_hash_sha256_state*>(state_.data())),
        reinterpret_cast<const unsigned char*>(bytes.data()), bytes.size());
}

std::string Checksum::hex() {
    std::array<unsigned char, crypto_hash_sha256_BYTES> sum{};
    crypto_hash_sha256_final(
        std::launder(reinterpret_cast<crypto_hash_sha256_state*>(state_.data())), sum.data());
    std::string text(kChecksumDigits + 1, '\0');
    sodium_bin2hex(text.data(), text.size(), sum.data(), sum.size());
    text.pop_back();
    return text;
}

std::string checksumOfFile(int descriptor) {
    Checksum sum;
    std::vector<char> piece(kPieceBytes);
    for (off_t at = 0;;) {
        const ssize_t got = ::pread(descriptor, piece.data(), piece.size(), at);
        if (got < 0 && errno == EINTR) continue;
        if (got < 0) throw std::system_error(errno, std::generic_category(), "cannot read");
        if (got == 0) return sum.hex();
        sum.add({piece.data(), static_cast<std::size_t>(got)});
        at += got;
    }
}

}  // namespace fleet
