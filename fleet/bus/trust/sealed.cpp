#include "fleet/bus/trust/sealed.h"

#include <sodium.h>

#include <array>
#include <optional>
#include <stdexcept>

#include "fleet/bus/accounts/nkey.h"

namespace fleet {
namespace {

using SealingKey = std::array<unsigned char, crypto_box_PUBLICKEYBYTES>;

const unsigned char* rawBytes(std::string_view bytes) {
    return reinterpret_cast<const unsigned char*>(bytes.data());
}

/// The same key signs and unseals: a host has one to be known by, besides that of its connection.
/// Nothing if it cannot: what is no point of the curve's main group can be read by anybody.
std::optional<SealingKey> sealingKeyOf(std::string_view publicKey) {
    const std::optional<std::string> key = bytesOfPublicKey(publicKey);
    SealingKey half{};
    if (!key || sodium_init() < 0 ||
        crypto_sign_ed25519_pk_to_curve25519(half.data(), rawBytes(*key)) != 0) {
        return std::nullopt;
    }
    return half;
}

}  // namespace

bool canSealFor(std::string_view publicKey) {
    return sealingKeyOf(publicKey).has_value();
}

std::string sealFor(std::string_view publicKey, std::string_view text) {
    const std::optional<SealingKey> key = sealingKeyOf(publicKey);
    if (!key) throw std::invalid_argument("nothing can be sealed for this key");
    std::string sealed(text.size() + crypto_box_SEALBYTES, '\0');
    crypto_box_seal(reinterpret_cast<unsigned char*>(sealed.data()), rawBytes(text), text.size(),
                    key->data());
    return sealed;
}

}  // namespace fleet
