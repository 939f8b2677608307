#include "fleet/operator/orders/order_chain.h"

#include <sodium.h>

#include <array>
#include <utility>

namespace fleet {
namespace {

/// No message of the fleet is signed for a purpose of this name, and the signature stays here.
constexpr const char* kIdentifierPurpose = "order-identifier";
constexpr std::size_t kIdentifierBytes = 16;

}  // namespace

OrderChain::OrderChain(const KeyPair& key, std::string rollout, std::string host)
    : key_(key), rollout_(std::move(rollout)), host_(std::move(host)) {}

std::string OrderChain::identifier(std::size_t number) const {
    std::string place(kIdentifierPurpose);
    for (const std::string& part : {rollout_, host_, std::to_string(number)}) {
        place += '\0';
        place += part;
    }
    const std::string signature = key_.sign(place);
    std::array<unsigned char, kIdentifierBytes> bits{};
    crypto_generichash(bits.data(), bits.size(),
                       reinterpret_cast<const unsigned char*>(signature.data()), signature.size(),
                       nullptr, 0);
    std::string digits(2 * kIdentifierBytes + 1, '\0');
    sodium_bin2hex(digits.data(), digits.size(), bits.data(), bits.size());
    digits.pop_back();  // the zero byte at its end
    return digits;
}

std::optional<std::size_t> OrderChain::numberOf(const std::string& identifier) const {
    for (std::size_t number = 0; number < kMostTries; ++number) {
        if (this->identifier(number) == identifier) return number;
    }
    return std::nullopt;
}

}  // namespace fleet
