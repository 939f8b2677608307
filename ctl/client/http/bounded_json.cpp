#include "ctl/client/http/bounded_json.h"

#include <algorithm>

using nlohmann::json;

namespace ctl {
namespace {

/// What the brackets of a text come to, whether or not it is JSON.
struct Brackets {
    std::size_t deepest = 0;
    std::size_t count = 0;
};

/// One pass over the bytes, so that the limits hold before anything is allocated.
Brackets bracketsOf(const std::string& text) {
    Brackets found;
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
            ++found.count;
            found.deepest = std::max(found.deepest, ++depth);
        } else if ((c == '}' || c == ']') && depth > 0) {
            --depth;
        }
    }
    return found;
}

}  // namespace

ParsedJson parseBounded(const std::string& text) {
    if (text.size() > kMostBytes) return {nullptr, "is larger than 64 MiB"};
    const Brackets brackets = bracketsOf(text);
    if (brackets.deepest > kMostLevels) return {nullptr, "is nested deeper than 100 levels"};
    // The document itself and its list of rows are no rows; a few more lists stand beside them.
    if (brackets.count > kMostRows + kMostLevels) return {nullptr, "has more than 1,000,000 rows"};
    json document = json::parse(text, nullptr, false);
    if (document.is_discarded()) return {nullptr, "is no JSON"};
    return {std::move(document), nullptr};
}

json objectIn(const std::string& text) {
    json document = parseBounded(text).document;
    return document.is_object() ? document : json();
}

}  // namespace ctl
