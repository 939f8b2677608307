/// Request targets.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace http {

/// A request target, decoded.
struct Target {
    std::string path;
    /// The path between its slashes, each segment decoded by itself: an escaped slash is a
    /// character of its segment. "/" has one segment, which is empty.
    std::vector<std::string> segments;
    /// Names and values in the order in which they stand; a name without "=" has an empty value.
    std::vector<std::pair<std::string, std::string>> parameters;
};

/// Reads "/path?name=value&..." or the same behind "http://host". Percent escapes are decoded, and
/// in parameters "+" is a blank, as in forms. Returns nothing when an escape is malformed or stands
/// for the character 0, which no value can hold.
std::optional<Target> parseTarget(std::string_view target);

}  // namespace http
