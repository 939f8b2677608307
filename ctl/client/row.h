/// Reading a table's row as the host gives it: a JSON object with a member per column.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

namespace ctl {

/// What returnCodeOf() gives for a row without a usable RETVAL. No host sends it.
constexpr int kNoReturnCode = -1;

/// A value as text: a string as it is, null as nothing, everything else as JSON.
std::string valueText(const nlohmann::json& value);

/// A column's text; empty when the row has no such column.
std::string textOf(const nlohmann::json& row, const std::string& column);

/// The row's RETVAL, 0 for success. kNoReturnCode when it has none or one that is no 32-bit
/// number: nothing is known then, and that is no success.
int returnCodeOf(const nlohmann::json& row);

}  // namespace ctl
