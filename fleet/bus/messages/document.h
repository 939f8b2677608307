/// The JSON texts of messages, read strictly: whoever sent them, they change nothing unless all of
/// them is as it must be.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/messages/values.h"

namespace fleet {

/// What is wrong with a message, for people.
class MessageError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// The text as an object of at most 16 levels. Throws MessageError.
nlohmann::json readDocument(std::string_view text);

// Members of an object. Each throws MessageError, which names the member, when it is missing or of
// another kind.
std::string textIn(const nlohmann::json& object, const char* member);
bool flagIn(const nlohmann::json& object, const char* member);
/// From 0 to kHighestNumber.
Number numberIn(const nlohmann::json& object, const char* member);
/// Milliseconds since 1970, not negative.
Moment momentIn(const nlohmann::json& object, const char* member);
/// At most `most` texts.
std::vector<std::string> textsIn(const nlohmann::json& object, const char* member,
                                 std::size_t most);

/// As JSON. Bytes that are no UTF-8 are replaced.
std::string textOf(const nlohmann::json& document);

/// Bytes as text, and back; MessageError if the text is none.
std::string base64Of(std::string_view bytes);
std::string bytesOfBase64(std::string_view text);

}  // namespace fleet
