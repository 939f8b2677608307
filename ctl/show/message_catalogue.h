/// The message catalogue: what the message identifiers in results mean, in words.
#pragma once

#include <string>

namespace ctl {

/// The meaning of a message identifier such as "ZAV1024E"; empty for one that is not known.
std::string messageText(const std::string& id);

/// A message parameter fit for a terminal: control characters are shown as \xNN.
std::string printable(const std::string& text);

/// "ZAV1024E: the start or stop command ended with a bad return code [parameter]". Without an
/// identifier the return code stands in its place.
std::string describeResult(int returnCode, const std::string& id, const std::string& parameter);

}  // namespace ctl
