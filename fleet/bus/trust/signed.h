/// Signed messages: whoever carries one can neither change it nor use it for something else.
///
/// The bytes: a signature of 64 bytes; the length of the text, 4 bytes, the highest first; the
/// text, a JSON object; and whatever the message carries along, up to the end. The signature covers
/// the purpose's name, a zero byte, and all behind the signature as it was sent.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/accounts/nkey.h"

namespace fleet {

/// What a signature is for. One that was made for one purpose is worth nothing for another.
enum class Purpose {
    Certifying,
    Ordering,
    Numbering,
    Greeting,
    Replying,
    Reporting,
    Describing,
    Asking,
    Answering,
    Enrolling,
    LoggingIn,
    OpeningSession
};

/// The parts of a message, somewhere in its bytes.
struct SignedParts {
    std::string_view signature;
    std::string_view covered;  ///< what follows the signature
    std::string_view text;
    std::string_view carried;
};

/// No message is longer.
constexpr std::size_t kMostSignedBytes = std::size_t{1024} * 1024;

std::string signMessage(Purpose purpose, const KeyPair& key, std::string_view text,
                        std::string_view carried = {});

/// The parts, whoever has signed them; nothing if it is no such message. They last as long as the
/// bytes.
std::optional<SignedParts> partsOf(std::string_view bytes);

/// Whether the holder of the public key has signed the message for this purpose.
bool isSigned(const SignedParts& parts, Purpose purpose, std::string_view publicKey);
/// Whether one of them has.
bool isSigned(const SignedParts& parts, Purpose purpose,
              const std::vector<std::string>& publicKeys);

}  // namespace fleet
