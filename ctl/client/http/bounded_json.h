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
/// Commas between the members and elements of one answer, all together. Each member takes some
/// hundred bytes and a search for its place, so those that fit into the bytes of an answer would
/// take longer than anybody waits. This many are read within a second or two; they are 50,000 rows
/// of twenty columns.
constexpr std::size_t kMostCommas = 1'000'000;
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
