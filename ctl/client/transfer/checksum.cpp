#include "ctl/client/transfer/checksum.h"

// The digest's own functions: no tables of algorithms, no providers, no memory.
#define OPENSSL_API_COMPAT 10101
#include <openssl/sha.h>

namespace ctl {

struct Checksum::State {
    SHA256_CTX context;
};

Checksum::Checksum() : state_(std::make_unique<State>()) {
    SHA256_Init(&state_->context);
}

Checksum::~Checksum() = default;

void Checksum::add(const unsigned char* data, std::size_t length) {
    SHA256_Update(&state_->context, data, length);
}

std::string Checksum::finish() {
    static const char* const kDigits = "0123456789abcdef";
    unsigned char digest[SHA256_DIGEST_LENGTH];
    SHA256_Final(digest, &state_->context);
    std::string text;
    for (const unsigned char byte : digest) {
        text += kDigits[byte >> 4];
        text += kDigits[byte & 15U];
    }
    return text;
}

}  // namespace ctl
