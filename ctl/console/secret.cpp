#include "ctl/console/secret.h"

#include <sys/random.h>

#include <array>
#include <cerrno>
#include <stdexcept>

namespace console {
namespace {

constexpr std::size_t kSecretBytes = 32;
constexpr std::string_view kDigits = "0123456789abcdef";

}  // namespace

std::string newSecret() {
    std::array<unsigned char, kSecretBytes> bytes{};
    ssize_t got = 0;
    do {
        got = ::getrandom(bytes.data(), bytes.size(), 0);
    } while (got < 0 && errno == EINTR);
    // The kernel gives so few bytes whole or not at all.
    if (got != static_cast<ssize_t>(bytes.size())) {
        throw std::runtime_error("the kernel gives no random numbers");
    }
    std::string text;
    for (const unsigned char byte : bytes) {
        text += kDigits[byte >> 4];
        text += kDigits[byte & 15];
    }
    return text;
}

bool isSecretText(std::string_view text) {
    return text.size() == 2 * kSecretBytes &&
           text.find_first_not_of(kDigits) == std::string_view::npos;
}

bool isSameSecret(std::string_view one, std::string_view other) {
    if (one.size() != other.size()) return false;
    // Volatile, so that no compiler ends the comparison at the first difference.
    volatile unsigned char difference = 0;
    for (std::size_t i = 0; i < one.size(); ++i) {
        difference =
            static_cast<unsigned char>(difference | (static_cast<unsigned char>(one[i]) ^
                                                     static_cast<unsigned char>(other[i])));
    }
    return difference == 0;
}

}  // namespace console
