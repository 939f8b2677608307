#include "ctl/client/row.h"

#include <cstdint>
#include <limits>
#include <nlohmann/json.hpp>

using nlohmann::json;

namespace ctl {

std::string valueText(const json& value) {
    if (value.is_string()) return value.get<std::string>();
    if (value.is_null()) return {};
    return value.dump(-1, ' ', false, json::error_handler_t::replace);
}

std::string textOf(const json& row, const std::string& column) {
    const auto found = row.find(column);
    return found == row.end() ? std::string() : valueText(*found);
}

bool flagOf(const json& object, const std::string& member, bool fallback) {
    const auto found = object.find(member);
    return found != object.end() && found->is_boolean() ? found->get<bool>() : fallback;
}

std::uint64_t countOf(const json& object, const std::string& member) {
    const auto found = object.find(member);
    if (found == object.end() || !found->is_number_integer()) return 0;
    // A number too large for the signed type is kept as an unsigned one.
    if (!found->is_number_unsigned() && found->get<std::int64_t>() < 0) return 0;
    return found->get<std::uint64_t>();
}

bool isBetween(const json& object, const std::string& member, std::int64_t least,
               std::int64_t most) {
    const auto found = object.find(member);
    if (found == object.end() || !found->is_number_integer()) return false;
    constexpr auto kMost = static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max());
    if (found->is_number_unsigned() && found->get<std::uint64_t>() > kMost) return false;
    const auto number = found->get<std::int64_t>();
    return number >= least && number <= most;
}

int returnCodeOf(const json& row) {
    const auto found = row.find("RETVAL");
    if (found == row.end() || !found->is_number_integer()) return kNoReturnCode;
    const auto value = found->get<std::int64_t>();
    using Limits = std::numeric_limits<std::int32_t>;
    return value < Limits::min() || value > Limits::max() ? kNoReturnCode : static_cast<int>(value);
}

}  // namespace ctl
