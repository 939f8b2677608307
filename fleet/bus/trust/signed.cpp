#include "fleet/bus/trust/signed.h"

#include <algorithm>
#include <cstdint>

namespace fleet {
namespace {

constexpr std::size_t kSignature = 64;
constexpr std::size_t kLength = 4;

std::string_view nameOf(Purpose purpose) {
    switch (purpose) {
        case Purpose::Certifying:
            return "certificate";
        case Purpose::Ordering:
            return "order";
        case Purpose::Numbering:
            return "number";
        case Purpose::Greeting:
            return "hello";
        case Purpose::Replying:
            return "reply";
        case Purpose::Reporting:
            return "out";
        case Purpose::Describing:
            return "facts";
        case Purpose::Asking:
            return "ask";
        case Purpose::Answering:
            return "ans";
        case Purpose::Enrolling:
            return "enrol";
        case Purpose::LoggingIn:
            return "login";
        case Purpose::OpeningSession:
            return "session";
    }
    return "";
}

std::string coveredBytes(Purpose purpose, std::string_view message) {
    std::string bytes(nameOf(purpose));
    bytes.push_back('\0');
    bytes.append(message);
    return bytes;
}

std::string lengthBytes(std::size_t length) {
    std::string bytes;
    for (int shift = 24; shift >= 0; shift -= 8) {
        bytes.push_back(static_cast<char>((length >> shift) & 0xFFU));
    }
    return bytes;
}

std::size_t lengthIn(std::string_view bytes) {
    std::size_t length = 0;
    for (const char byte : bytes.substr(0, kLength)) {
        length = (length << 8U) | static_cast<unsigned char>(byte);
    }
    return length;
}

}  // namespace

std::string signMessage(Purpose purpose, const KeyPair& key, std::string_view text,
                        std::string_view carried) {
    std::string message = lengthBytes(text.size());
    message.append(text).append(carried);
    return key.sign(coveredBytes(purpose, message)) + message;
}

std::optional<SignedParts> partsOf(std::string_view bytes) {
    if (bytes.size() < kSignature + kLength || bytes.size() > kMostSignedBytes) return std::nullopt;
    SignedParts parts;
    parts.signature = bytes.substr(0, kSignature);
    parts.covered = bytes.substr(kSignature);
    const std::string_view rest = parts.covered.substr(kLength);
    const std::size_t length = lengthIn(parts.covered);
    if (length > rest.size()) return std::nullopt;
    parts.text = rest.substr(0, length);
    parts.carried = rest.substr(length);
    return parts;
}

bool isSigned(const SignedParts& parts, Purpose purpose, std::string_view publicKey) {
    return isSignedBy(publicKey, coveredBytes(purpose, parts.covered), parts.signature);
}

bool isSigned(const SignedParts& parts, Purpose purpose,
              const std::vector<std::string>& publicKeys) {
    return std::any_of(publicKeys.begin(), publicKeys.end(), [&](const std::string& publicKey) {
        return isSigned(parts, purpose, publicKey);
    });
}

}  // namespace fleet
