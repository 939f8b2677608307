#include "host/guard/wording.h"

#include <algorithm>

namespace host {
namespace {

constexpr std::size_t kLongestQuoted = 120;  // bytes
constexpr std::size_t kShownNames = 20;

}  // namespace

std::string quoted(const std::string& value, const CodePage& codePage) {
    std::string shown = value;
    if (shown.size() > kLongestQuoted) {
        shown.resize(kLongestQuoted);
        shown += "...";
    }
    return '"' + codePage.toUtf8(shown) + '"';
}

std::string enumerated(const std::vector<std::string>& names, const CodePage& codePage) {
    std::string text;
    for (std::size_t i = 0; i < std::min(names.size(), kShownNames); ++i)
        text += (i > 0 ? ", " : "") + codePage.toUtf8(names[i]);
    if (names.size() > kShownNames) {
        text += " and " + std::to_string(names.size() - kShownNames) + " more";
    }
    return text;
}

}  // namespace host
