/// The message catalogue: what the message identifiers in results mean. The host sends identifiers
/// only.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

namespace ctl {

/// The meaning of a message identifier such as "ZAV1024E". Empty for an unknown one.
std::string messageText(const std::string& id);

/// "ZAV1024E: the start or stop command ended with a bad return code [parameter]". Without an
/// identifier the return code stands in its place.
std::string describeResult(int returnCode, const std::string& id, const std::string& parameter);

/// The same for a row of results.
std::string describeRow(const nlohmann::json& row);

}  // namespace ctl
