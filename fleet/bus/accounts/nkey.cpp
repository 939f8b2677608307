#include "fleet/bus/accounts/nkey.h"

#include <sodium.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <stdexcept>

#include "fleet/bus/accounts/base32.h"

namespace fleet {

namespace {

// The first letters are the upper five bits of these bytes.
constexpr unsigned kPrefixOfSeed = 18U << 3U;
constexpr unsigned kPrefixOfUser = 20U << 3U;
constexpr unsigned kPrefixOfAccount = 0U;
constexpr unsigned kPrefixOfOperator = 14U << 3U;
constexpr std::size_t kLengthOfHalf = 32;
constexpr std::size_t kLengthOfCheckSum = 2;

unsigned prefixOf(KeyKind kind) {
    switch (kind) {
        case KeyKind::User:
            return kPrefixOfUser;
        case KeyKind::Account:
            return kPrefixOfAccount;
        case KeyKind::Operator:
            return kPrefixOfOperator;
    }
    throw std::invalid_argument("no kind of a key");
}

std::optional<KeyKind> kindOf(unsigned prefix) {
    for (const KeyKind kind : {KeyKind::User, KeyKind::Account, KeyKind::Operator}) {
        if (prefixOf(kind) == prefix) return kind;
    }
    return std::nullopt;
}

/// CRC-16 with the polynomial 0x1021, the highest bit first, begun with 0; the low byte first.
std::string checkSumOf(std::string_view bytes) {
    unsigned sum = 0;
    for (const char byte : bytes) {
        sum ^= static_cast<unsigned>(static_cast<unsigned char>(byte)) << 8U;
        for (int bit = 0; bit < 8; ++bit) {
            sum = (sum & 0x8000U) != 0 ? (sum << 1U ^ 0x1021U) : sum << 1U;
            sum &= 0xFFFFU;
        }
    }
    return {static_cast<char>(sum & 0xFFU), static_cast<char>(sum >> 8U)};
}

std::string encoded(std::string bytes) {
    bytes += checkSumOf(bytes);
    std::string text = base32Encoded(bytes);
    sodium_memzero(bytes.data(), bytes.size());
    return text;
}

/// The bytes before the check sum, if that is right and they are as many.
std::optional<std::string> decoded(std::string_view text, std::size_t length) {
    std::optional<std::string> bytes = base32Decoded(text);
    if (!bytes || bytes->size() != length + kLengthOfCheckSum) return std::nullopt;
    const std::string sum = bytes->substr(length);
    bytes->resize(length);
    if (checkSumOf(*bytes) != sum) return std::nullopt;
    return bytes;
}

const unsigned char* raw(std::string_view bytes) {
    return reinterpret_cast<const unsigned char*>(bytes.data());
}

unsigned byteAt(const std::string& bytes, std::size_t at) {
    return static_cast<unsigned char>(bytes[at]);
}

void useSodium() {
    if (sodium_init() < 0) throw std::runtime_error("libsodium cannot be used");
}

}  // namespace

bool isPublicKey(std::string_view text, KeyKind kind) {
    const auto bytes = decoded(text, 1 + kLengthOfHalf);
    return bytes && byteAt(*bytes, 0) == prefixOf(kind);
}

bool isSignedBy(std::string_view publicKey, std::string_view bytes, std::string_view signature) {
    const auto key = decoded(publicKey, 1 + kLengthOfHalf);
    if (!key || !kindOf(byteAt(*key, 0)) || signature.size() != crypto_sign_BYTES) return false;
    useSodium();
    return crypto_sign_verify_detached(raw(signature), raw(bytes), bytes.size(), raw(*key) + 1) ==
           0;
}

std::optional<std::string> bytesOfPublicKey(std::string_view publicKey) {
    const auto key = decoded(publicKey, 1 + kLengthOfHalf);
    if (!key || !kindOf(byteAt(*key, 0))) return std::nullopt;
    return key->substr(1);
}

std::optional<std::string> KeyPair::unseal(std::string_view sealed) const {
    if (sealed.size() < crypto_box_SEALBYTES) return std::nullopt;
    std::array<unsigned char, crypto_box_PUBLICKEYBYTES> publicHalf{};
    std::array<unsigned char, crypto_box_SECRETKEYBYTES> secretHalf{};
    std::string text(sealed.size() - crypto_box_SEALBYTES, '\0');
    const bool isKey =
        crypto_sign_ed25519_pk_to_curve25519(publicHalf.data(), secret_.data() + 32) == 0 &&
        crypto_sign_ed25519_sk_to_curve25519(secretHalf.data(), secret_.data()) == 0;
    const bool isOpen =
        isKey && crypto_box_seal_open(reinterpret_cast<unsigned char*>(text.data()), raw(sealed),
                                      sealed.size(), publicHalf.data(), secretHalf.data()) == 0;
    sodium_memzero(secretHalf.data(), secretHalf.size());
    if (!isOpen) return std::nullopt;
    return text;
}

KeyPair KeyPair::make(KeyKind kind) {
    useSodium();
    Seed seed;
    randombytes_buf(seed.data(), seed.size());
    KeyPair pair(kind, seed);
    sodium_memzero(seed.data(), seed.size());
    return pair;
}

std::optional<KeyPair> KeyPair::ofSeed(std::string_view text) {
    auto bytes = decoded(text, 2 + kLengthOfHalf);
    if (!bytes || (byteAt(*bytes, 0) & 0xF8U) != kPrefixOfSeed) return std::nullopt;
    // The kind's five bits are spread over two bytes, so that the second letter shows it.
    const unsigned prefix = (byteAt(*bytes, 0) & 7U) << 5U | byteAt(*bytes, 1) >> 3U;
    const auto kind = (byteAt(*bytes, 1) & 7U) == 0 ? kindOf(prefix) : std::nullopt;
    if (!kind) return std::nullopt;
    useSodium();
    Seed seed;
    std::copy_n(raw(*bytes) + 2, seed.size(), seed.begin());
    KeyPair pair(*kind, seed);
    sodium_memzero(seed.data(), seed.size());
    std::string& secret = *bytes;
    sodium_memzero(secret.data(), secret.size());
    return pair;
}

KeyPair::KeyPair(KeyKind kind, const Seed& seed) : kind_(kind) {
    std::array<unsigned char, kLengthOfHalf> half{};
    crypto_sign_seed_keypair(half.data(), secret_.data(), seed.data());
    std::string bytes(1, static_cast<char>(prefixOf(kind)));
    bytes.append(half.begin(), half.end());
    publicKey_ = encoded(std::move(bytes));
}

KeyPair::~KeyPair() {
    sodium_memzero(secret_.data(), secret_.size());
}

std::string KeyPair::seed() const {
    const unsigned prefix = prefixOf(kind_);
    std::string bytes;
    bytes.reserve(2 + kLengthOfHalf + kLengthOfCheckSum);  // no copies of a secret are left behind
    bytes += static_cast<char>(kPrefixOfSeed | prefix >> 5U);
    bytes += static_cast<char>((prefix & 0x1FU) << 3U);
    bytes.append(secret_.begin(), secret_.begin() + kLengthOfHalf);
    return encoded(std::move(bytes));
}

std::string KeyPair::sign(std::string_view bytes) const {
    std::string signature(crypto_sign_BYTES, '\0');
    crypto_sign_detached(reinterpret_cast<unsigned char*>(signature.data()), nullptr, raw(bytes),
                         bytes.size(), secret_.data());
    return signature;
}

}  // namespace fleet
