#include "fleet/bus/messages/invitation.h"

#include <sodium.h>

#include <algorithm>
#include <array>
#include <nlohmann/json.hpp>
#include <stdexcept>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/document.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::size_t kTokenBytes = 16;
constexpr std::size_t kTokenLength = 22;
constexpr std::size_t kAuthorityLength = 64;
constexpr std::size_t kLongestInvitation = 4096;
constexpr int kBase64Url = sodium_base64_VARIANT_URLSAFE_NO_PADDING;

std::string base64UrlOf(std::string_view bytes) {
    std::string text(sodium_base64_encoded_len(bytes.size(), kBase64Url), '\0');
    sodium_bin2base64(text.data(), text.size(),
                      reinterpret_cast<const unsigned char*>(bytes.data()), bytes.size(),
                      kBase64Url);
    text.pop_back();  // the zero byte at its end
    return text;
}

std::optional<std::string> bytesOfBase64Url(std::string_view text) {
    std::string bytes(text.size(), '\0');
    std::size_t length = 0;
    const char* end = nullptr;
    if (sodium_base642bin(reinterpret_cast<unsigned char*>(bytes.data()), bytes.size(), text.data(),
                          text.size(), nullptr, &length, &end, kBase64Url) != 0 ||
        end != text.data() + text.size()) {
        return std::nullopt;
    }
    bytes.resize(length);
    return bytes;
}

std::string_view withoutBlanksAround(std::string_view text) {
    const char* const blanks = " \t\r\n";
    const std::size_t first = text.find_first_not_of(blanks);
    if (first == std::string_view::npos) return {};
    return text.substr(first, text.find_last_not_of(blanks) - first + 1);
}

bool isFingerprint(const std::string& text) {
    return text.size() == kAuthorityLength && std::all_of(text.begin(), text.end(), [](char c) {
               return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f');
           });
}

void requireSodium() {
    if (sodium_init() < 0) throw std::runtime_error("libsodium cannot be used");
}

}  // namespace

std::string invitationText(const Invitation& invitation) {
    return base64UrlOf(textOf({{"url", invitation.url},
                               {"authority", invitation.authority},
                               {"fleet", invitation.fleet},
                               {"root", invitation.root},
                               {"token", invitation.token}}));
}

Invitation readInvitation(std::string_view text) {
    const std::string_view word = withoutBlanksAround(text);
    const auto bytes = word.size() > kLongestInvitation ? std::nullopt : bytesOfBase64Url(word);
    if (!bytes) throw MessageError("this is no invitation to a fleet; copy the whole line");
    const json document = readDocument(*bytes);
    Invitation read;
    read.url = textIn(document, "url");
    read.authority = textIn(document, "authority");
    read.fleet = textIn(document, "fleet");
    read.root = textIn(document, "root");
    read.token = textIn(document, "token");
    if (read.url.rfind("https://", 0) != 0) throw MessageError("\"url\" is none of HTTPS");
    if (!isFingerprint(read.authority)) throw MessageError("\"authority\" is no fingerprint");
    if (!isPublicKey(read.root, KeyKind::Operator)) throw MessageError("\"root\" is no key");
    if (!fingerprintOfToken(read.token)) throw MessageError("\"token\" is none");
    return read;
}

std::string makeJoinToken() {
    requireSodium();
    std::array<char, kTokenBytes> bytes{};
    randombytes_buf(bytes.data(), bytes.size());
    std::string token = base64UrlOf({bytes.data(), bytes.size()});
    sodium_memzero(bytes.data(), bytes.size());
    return token;
}

std::optional<std::string> fingerprintOfToken(std::string_view token) {
    if (token.size() != kTokenLength) return std::nullopt;
    const std::optional<std::string> bytes = bytesOfBase64Url(token);
    if (!bytes || bytes->size() != kTokenBytes) return std::nullopt;
    requireSodium();
    std::string hash(crypto_generichash_BYTES, '\0');
    crypto_generichash(reinterpret_cast<unsigned char*>(hash.data()), hash.size(),
                       reinterpret_cast<const unsigned char*>(bytes->data()), bytes->size(),
                       nullptr, 0);
    return hash;
}

}  // namespace fleet
