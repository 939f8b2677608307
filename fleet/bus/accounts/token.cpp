#include "fleet/bus/accounts/token.h"

#include <sodium.h>

#include <array>
#include <nlohmann/json.hpp>
#include <string_view>

#include "fleet/bus/accounts/base32.h"

namespace fleet {

namespace {

constexpr int kVariant = sodium_base64_VARIANT_URLSAFE_NO_PADDING;

std::string base64Url(std::string_view bytes) {
    std::string text(sodium_base64_encoded_len(bytes.size(), kVariant), '\0');
    sodium_bin2base64(text.data(), text.size(),
                      reinterpret_cast<const unsigned char*>(bytes.data()), bytes.size(), kVariant);
    text.pop_back();  // the terminator
    return text;
}

/// A name of the token that follows from what it says.
std::string digestOf(const std::string& text) {
    std::array<unsigned char, crypto_generichash_BYTES> digest{};
    crypto_generichash(digest.data(), digest.size(),
                       reinterpret_cast<const unsigned char*>(text.data()), text.size(), nullptr,
                       0);
    return base32Encoded({reinterpret_cast<const char*>(digest.data()), digest.size()});
}

}  // namespace

std::string signedToken(const TokenHead& head, const std::string& nats, const KeyPair& issuer) {
    nlohmann::json claims = {{"iss", issuer.publicKey()},
                             {"sub", head.subject},
                             {"name", head.name},
                             {"iat", head.issuedAt.count()},
                             {"nats", nlohmann::json::parse(nats)}};
    if (head.expires) claims["exp"] = head.expires->count();
    claims["jti"] = digestOf(claims.dump());
    const std::string text =
        base64Url(R"({"typ":"JWT","alg":"ed25519-nkey"})") + "." + base64Url(claims.dump());
    return text + "." + base64Url(issuer.sign(text));
}

bool isTokenSignedBy(std::string_view token, std::string_view issuer) {
    const std::size_t dot = token.rfind('.');
    if (dot == std::string_view::npos) return false;
    const std::string_view text = token.substr(dot + 1);
    std::string signature(text.size(), '\0');
    std::size_t length = 0;
    if (sodium_base642bin(reinterpret_cast<unsigned char*>(signature.data()), signature.size(),
                          text.data(), text.size(), nullptr, &length, nullptr, kVariant) != 0) {
        return false;
    }
    signature.resize(length);
    return isSignedBy(issuer, token.substr(0, dot), signature);
}

}  // namespace fleet
