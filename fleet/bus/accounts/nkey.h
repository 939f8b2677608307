/// Keys of the bus: ed25519 key pairs whose public halves are the names of users, accounts and
/// operators.
#pragma once

#include <array>
#include <optional>
#include <string>
#include <string_view>

namespace fleet {

/// Whose key it is; the first letter of its public half tells.
enum class KeyKind {
    User,     ///< U...: a host or the centre
    Account,  ///< A...: a part of the bus with subjects of its own, or a key that signs its users
    Operator  ///< O...: who signs the accounts
};

/// Whether the text is the public half of a key of that kind, with the right check sum. Such a text
/// consists of 56 capital letters and digits, so it is one token of a subject and no wildcard.
bool isPublicKey(std::string_view text, KeyKind kind);

/// Whether the holder of the public key (of any kind) made the signature of 64 bytes over the
/// bytes.
bool isSignedBy(std::string_view publicKey, std::string_view bytes, std::string_view signature);

/// The 32 bytes of a public key of any kind; nothing if it is not one.
std::optional<std::string> bytesOfPublicKey(std::string_view publicKey);

/// A key pair. Its secret is wiped when the object ends. Const operations may run in any thread.
class KeyPair {
public:
    /// A new one from the system's source of randomness. Throws std::runtime_error if the library
    /// of cryptography cannot be used.
    static KeyPair make(KeyKind kind);
    /// That of a seed ("SU...", "SA...", "SO..."); nothing if it is not one.
    static std::optional<KeyPair> ofSeed(std::string_view seed);

    KeyPair(const KeyPair&) = default;
    KeyPair& operator=(const KeyPair&) = default;
    ~KeyPair();

    KeyKind kind() const { return kind_; }
    const std::string& publicKey() const { return publicKey_; }
    /// What everything else follows from. It is secret; who calls wipes it.
    std::string seed() const;
    /// A signature of 64 bytes.
    std::string sign(std::string_view bytes) const;
    /// What was sealed for the public key, see sealFor(); nothing if it was not.
    std::optional<std::string> unseal(std::string_view sealed) const;

private:
    using Seed = std::array<unsigned char, 32>;
    using Secret = std::array<unsigned char, 64>;
    KeyPair(KeyKind kind, const Seed& seed);

    KeyKind kind_;
    Secret secret_{};  ///< the seed and the public half behind it
    std::string publicKey_;
};

}  // namespace fleet
