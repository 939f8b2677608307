#include "fleet/link/program/machine.h"

#include <sodium.h>

#include <array>
#include <fstream>

namespace fleet {

std::string machineIdentity(const std::string& host, const std::string& file) {
    std::ifstream opened(file);
    std::string machine;
    if (!std::getline(opened, machine) || machine.empty()) return "";
    const std::string text =
        "zavlink" + std::string(1, '\0') + host + std::string(1, '\0') + machine;
    std::array<unsigned char, crypto_hash_sha256_BYTES> sum{};
    crypto_hash_sha256(sum.data(), reinterpret_cast<const unsigned char*>(text.data()),
                       text.size());
    std::string digits(2 * sum.size() + 1, '\0');
    sodium_bin2hex(digits.data(), digits.size(), sum.data(), sum.size());
    digits.pop_back();
    return digits;
}

}  // namespace fleet
