/// Reads reports such as the inventory program's: a header line, followed by lines of fields.
/// Traces nothing, so that each caller can report in its own words what is missing. All functions
/// take time linear in the length of the text.
#pragma once

#include <cstdint>
#include <vector>

#include "base/zavstr.h"

namespace ZAV {

/// Where the body of a report begins; String::NPOS for what was not found.
struct ReportBody {
    std::uint32_t header = String::NPOS;   ///< the header's first code unit
    std::uint32_t newline = String::NPOS;  ///< the first newline at or after it
};

/// Finds the first occurrence of `header` in a report and the end of its line.
ReportBody findReportBody(const String& report, const String& header);

/// Splits a text into tokens, the longest runs without delimiters; tokens are never empty. Borrows
/// both texts.
class TokenScanner {
public:
    /// `delimiters` are ASCII characters. Begins at code unit `start`, which may lie beyond the
    /// end.
    TokenScanner(const String& text, const char* delimiters, std::uint32_t start = 0);

    /// Stores the next token in `token` and returns true. When none is left, returns false and
    /// leaves `token` unchanged.
    bool next(String& token);

private:
    bool isDelimiter(std::uint32_t position) const;

    const String& text_;
    const char* const delimiters_;
    std::uint32_t position_;
};

/// All tokens of a text. With newline as the delimiter these are its lines, without empty ones.
std::vector<String> splitFields(const String& text, const char* delimiters,
                                std::uint32_t start = 0);

}  // namespace ZAV
