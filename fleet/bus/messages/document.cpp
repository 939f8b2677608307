#include "fleet/bus/messages/document.h"

#include <sodium.h>

#include <cstdint>
#include <nlohmann/json.hpp>

using nlohmann::json;

namespace fleet {
namespace {

constexpr int kMostLevels = 16;
constexpr int kBase64 = sodium_base64_VARIANT_ORIGINAL;

const json& memberOf(const json& object, const char* member) {
    const auto found = object.find(member);
    if (found == object.end()) throw MessageError(std::string("there is no \"") + member + '"');
    return *found;
}

[[noreturn]] void throwWrongKind(const char* member, const char* kind) {
    throw MessageError(std::string("\"") + member + "\" is no " + kind);
}

std::uint64_t countIn(const json& object, const char* member) {
    const json& value = memberOf(object, member);
    if (!value.is_number_unsigned()) throwWrongKind(member, "number");
    const auto number = value.get<std::uint64_t>();
    if (number > kHighestNumber) throwWrongKind(member, "number that can be");
    return number;
}

}  // namespace

json readDocument(std::string_view text) {
    bool isTooDeep = false;
    const auto watch = [&isTooDeep](int depth, json::parse_event_t, const json&) {
        isTooDeep = isTooDeep || depth > kMostLevels;
        return !isTooDeep;
    };
    json document = json::parse(text.begin(), text.end(), watch, false);
    if (isTooDeep) throw MessageError("it is nested too deep");
    if (!document.is_object()) throw MessageError("it is no JSON object");
    return document;
}

std::string textIn(const json& object, const char* member) {
    const json& value = memberOf(object, member);
    if (!value.is_string()) throwWrongKind(member, "text");
    return value.get<std::string>();
}

bool flagIn(const json& object, const char* member) {
    const json& value = memberOf(object, member);
    if (!value.is_boolean()) throwWrongKind(member, "truth value");
    return value.get<bool>();
}

Number numberIn(const json& object, const char* member) {
    return countIn(object, member);
}

Moment momentIn(const json& object, const char* member) {
    return Moment(static_cast<Moment::rep>(countIn(object, member)));
}

std::vector<std::string> textsIn(const json& object, const char* member, std::size_t most) {
    const json& value = memberOf(object, member);
    if (!value.is_array()) throwWrongKind(member, "list");
    if (value.size() > most) throwWrongKind(member, "list of so few");
    std::vector<std::string> texts;
    for (const json& text : value) {
        if (!text.is_string()) throwWrongKind(member, "list of texts");
        texts.push_back(text.get<std::string>());
    }
    return texts;
}

std::string textOf(const json& document) {
    return document.dump(-1, ' ', false, json::error_handler_t::replace);
}

std::string base64Of(std::string_view bytes) {
    std::string text(sodium_base64_encoded_len(bytes.size(), kBase64), '\0');
    sodium_bin2base64(text.data(), text.size(),
                      reinterpret_cast<const unsigned char*>(bytes.data()), bytes.size(), kBase64);
    text.pop_back();  // the zero byte at its end
    return text;
}

std::string bytesOfBase64(std::string_view text) {
    std::string bytes(text.size(), '\0');
    std::size_t length = 0;
    const char* end = nullptr;
    if (sodium_base642bin(reinterpret_cast<unsigned char*>(bytes.data()), bytes.size(), text.data(),
                          text.size(), nullptr, &length, &end, kBase64) != 0 ||
        end != text.data() + text.size()) {
        throw MessageError("there are bytes that are no base64");
    }
    bytes.resize(length);
    return bytes;
}

}  // namespace fleet
