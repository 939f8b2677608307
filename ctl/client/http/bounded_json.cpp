#include "ctl/client/http/bounded_json.h"

#include <algorithm>

using nlohmann::json;

namespace ctl {
namespace {

/// What the punctuation of a text comes to, whether or not it is JSON.
struct Extent {
    std::size_t deepest = 0;
    std::size_t brackets = 0;  ///< that open
    std::size_t commas = 0;
};

/// One pass over the bytes, so that the limits hold before anything is allocated.
Extent extentOf(const std::string& text) {
    Extent found;
    std::size_t depth = 0;
    bool isString = false;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const char c = text[i];
        if (isString) {
            if (c == '\\') ++i;
            if (c == '"') isString = false;
        } else if (c == '"') {
            isString = true;
        } else if (c == '{' || c == '[') {
            ++found.brackets;
            found.deepest = std::max(found.deepest, ++depth);
        } else if ((c == '}' || c == ']') && depth > 0) {
            --depth;
        } else if (c == ',') {
            ++found.commas;
        }
    }
    return found;
}

}  // namespace

ParsedJson parseBounded(const std::string& text) {
    if (text.size() > kMostBytes) return {nullptr, "is larger than 64 MiB"};
    const Extent extent = extentOf(text);
    if (extent.deepest > kMostLevels) return {nullptr, "is nested deeper than 100 levels"};
    // The document itself and its list of rows are no rows; a few more lists stand beside them.
    if (extent.brackets > kMostRows + kMostLevels) return {nullptr, "has more than 1,000,000 rows"};
    if (extent.commas > kMostCommas) return {nullptr, "has more than 1,000,000 members"};
    json document = json::parse(text, nullptr, false);
    if (document.is_discarded()) return {nullptr, "is no JSON"};
    return {std::move(document), nullptr};
}

json objectIn(const std::string& text) {
    json document = parseBounded(text).document;
    return document.is_object() ? document : json();
}

}  // namespace ctl
