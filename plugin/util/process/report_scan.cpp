#include "util/process/report_scan.h"

#include <cstring>

namespace ZAV {

ReportBody findReportBody(const String& report, const String& header) {
    ReportBody body;
    body.header = report.find(header, 0);
    if (body.header != String::NPOS) {
        body.newline = report.find(static_cast<unsigned short>('\n'), body.header);
    }
    return body;
}

TokenScanner::TokenScanner(const String& text, const char* delimiters, std::uint32_t start)
    : text_(text), delimiters_(delimiters), position_(start) {}

bool TokenScanner::isDelimiter(std::uint32_t position) const {
    const unsigned short unit = text_.getData()[position];
    return unit != 0 && unit < 128 && std::strchr(delimiters_, unit) != nullptr;
}

bool TokenScanner::next(String& token) {
    const std::uint32_t length = text_.length();
    while (position_ < length && isDelimiter(position_))
        ++position_;
    if (position_ >= length) return false;
    const std::uint32_t start = position_;
    while (position_ < length && !isDelimiter(position_))
        ++position_;
    token.assign(text_.getData() + start, position_ - start);
    return true;
}

std::vector<String> splitFields(const String& text, const char* delimiters, std::uint32_t start) {
    std::vector<String> fields;
    TokenScanner scanner(text, delimiters, start);
    for (String field; scanner.next(field);)
        fields.push_back(field);
    return fields;
}

}  // namespace ZAV
