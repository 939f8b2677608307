#include "host/depot/checksum.h"

// The digest's own functions: no tables of algorithms, no providers, no memory.
#define OPENSSL_API_COMPAT 10101
#include <openssl/sha.h>
#include <unistd.h>

#include <cerrno>
#include <system_error>
#include <vector>

namespace host {
namespace {

constexpr std::size_t kPieceSize = std::size_t{128} * 1024;

std::size_t readSome(int descriptor, std::vector<unsigned char>& piece) {
    for (;;) {
        const ssize_t length = ::read(descriptor, piece.data(), piece.size());
        if (length >= 0) return static_cast<std::size_t>(length);
        if (errno != EINTR) throw std::system_error(errno, std::generic_category(), "read");
    }
}

std::string hexDigits(const unsigned char* bytes, std::size_t count) {
    static const char* const kDigits = "0123456789abcdef";
    std::string text;
    for (std::size_t i = 0; i < count; ++i) {
        text += kDigits[bytes[i] >> 4];
        text += kDigits[bytes[i] & 15U];
    }
    return text;
}

}  // namespace

Checksum checksumOf(int descriptor) {
    SHA256_CTX state;
    SHA256_Init(&state);
    Checksum sum;
    std::vector<unsigned char> piece(kPieceSize);
    while (const std::size_t length = readSome(descriptor, piece)) {
        SHA256_Update(&state, piece.data(), length);
        sum.bytes += length;
    }
    unsigned char digest[SHA256_DIGEST_LENGTH];
    SHA256_Final(digest, &state);
    sum.sha256 = hexDigits(digest, sizeof digest);
    return sum;
}

}  // namespace host
