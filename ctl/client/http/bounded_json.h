/// JSON that somebody else has written, within limits.
#pragma once

#include <cstddef>
#include <nlohmann/json.hpp>
#include <string>

namespace ctl {

/// Deeper documents are not read: printing and releasing them takes a stack frame per level.
constexpr std::size_t kMostLevels = 100;
/// Rows of one answer, counted as the objects and lists in it.
constexpr std::size_t kMostRows = 1'000'000;
/// Bytes of one answer, or of one event.
constexpr std::size_t kMostBytes = 64UL * 1024 * 1024;

struct ParsedJson {
    nlohmann::json document;      ///< null if there is a fault
    const char* fault = nullptr;  ///< what is wrong, such as "is no JSON"; null if nothing is
};

/// Reads a document. Never throws for what the text holds.
ParsedJson parseBounded(const std::string& text);

/// The same where nobody asks for the reason: null for everything that is not a JSON object.
nlohmann::json objectIn(const std::string& text);

}  // namespace ctl
