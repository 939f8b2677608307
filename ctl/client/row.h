/// Reading a table's row as the host gives it: a JSON object with a member per column. Other
/// objects of the host are read alike: whatever a member is, nothing here throws.
#pragma once

#include <cstdint>
#include <nlohmann/json_fwd.hpp>
#include <string>

namespace ctl {

/// What returnCodeOf() gives for a row without a usable RETVAL. No host sends it.
constexpr int kNoReturnCode = -1;

/// A value as text: a string as it is, null as nothing, everything else as JSON.
std::string valueText(const nlohmann::json& value);

/// A column's text; empty when the row has no such column.
std::string textOf(const nlohmann::json& row, const std::string& column);

/// A member that is true or false; the fallback when there is none, or it is something else.
bool flagOf(const nlohmann::json& object, const std::string& member, bool fallback);

/// A member that is a whole number, not negative; 0 when there is none, or it is something else.
std::uint64_t countOf(const nlohmann::json& object, const std::string& member);

/// Whether a member is a whole number from `least` to `most`.
bool isBetween(const nlohmann::json& object, const std::string& member, std::int64_t least,
               std::int64_t most);

/// The row's RETVAL, 0 for success. kNoReturnCode when it has none or one that is no 32-bit
/// number: nothing is known then, and that is no success.
int returnCodeOf(const nlohmann::json& row);

}  // namespace ctl
