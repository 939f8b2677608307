/// Reading the reports of the inventory program and its like: a header line, and below it lines
/// that consist of fields. Plain text work without traces, so that each reader of a report reports
/// what it missed in its own words. All functions take time in proportion to the text.
#pragma once

#include <cstdint>
#include <vector>

#include "base/zavstr.h"

namespace ZAV {

/// Where the part of a report that matters begins; String::NPOS for what was not found.
struct ReportBody {
    std::uint32_t header = String::NPOS;   ///< the header's first code unit
    std::uint32_t newline = String::NPOS;  ///< the first newline at or after it
};

/// Finds the first `header` in a report, and the end of its line.
ReportBody findReportBody(const String& report, const String& header);

/// Cuts a text into its tokens, the longest runs without delimiters; tokens are never empty.
/// Borrows both texts.
class TokenScanner {
public:
    /// `delimiters` are ASCII characters. Begins at code unit `start`, which may lie behind the
    /// text's end.
    TokenScanner(const String& text, const char* delimiters, std::uint32_t start = 0);

    /// Puts the next token into `token` and returns true; false, and `token` as it was, when there
    /// is none left.
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
