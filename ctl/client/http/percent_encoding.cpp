#include "ctl/client/http/percent_encoding.h"

#include <cstring>

namespace ctl {
namespace {

/// Independent of the locale, unlike std::isalnum().
bool isPlain(unsigned char byte) {
    return (byte >= '0' && byte <= '9') || (byte >= 'A' && byte <= 'Z') ||
           (byte >= 'a' && byte <= 'z') || (byte != 0 && std::strchr("-._~", byte) != nullptr);
}

}  // namespace

std::string percentEncoded(const std::string& text) {
    constexpr char kHex[] = "0123456789ABCDEF";
    std::string out;
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (isPlain(byte)) {
            out += c;
        } else {
            out += '%';
            out += kHex[byte >> 4];
            out += kHex[byte & 15];
        }
    }
    return out;
}

}  // namespace ctl
