#include "fleet/server/keys/trust/names.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/server/keys/files/keys_error.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::size_t kLongestGivenName = 64;
constexpr std::size_t kMostLabels = 100;

bool fitsSelector(const std::string& text, bool mayHaveStar) {
    const auto fits = [mayHaveStar](char c) {
        return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
               c == '-' || c == '_' || c == '.' || c == '/' || (mayHaveStar && c == '*');
    };
    return !text.empty() && text.size() <= kLongestGivenName &&
           std::all_of(text.begin(), text.end(), fits);
}

std::vector<std::string> splitList(const std::string& text) {
    std::vector<std::string> parts;
    if (text.empty()) return parts;
    std::size_t begin = 0;
    for (std::size_t end = 0; end != std::string::npos; begin = end + 1) {
        end = text.find(',', begin);
        parts.push_back(text.substr(begin, end == std::string::npos ? end : end - begin));
        if (end == std::string::npos) break;
    }
    return parts;
}

}  // namespace

void checkName(const std::string& name) {
    if (!fitsSelector(name, false)) {
        throw KeysError("\"" + name +
                        "\" is no name: 1 to 64 letters, digits, \"-\", \"_\", \".\" and \"/\"");
    }
    if (isPublicKey(name, KeyKind::User)) throw KeysError("a key is no name");
}

Labels labelsOf(const std::string& text) {
    Labels labels;
    for (const std::string& part : splitList(text)) {
        const std::size_t equals = part.find('=');
        const std::string key = part.substr(0, equals);
        const std::string value = equals == std::string::npos ? "" : part.substr(equals + 1);
        if (!fitsSelector(key, false) || !fitsSelector(value, false)) {
            throw KeysError("\"" + part + "\" is no label such as env=test");
        }
        if (!labels.emplace(key, value).second) {
            throw KeysError("the label \"" + key + "\" stands there twice");
        }
    }
    if (labels.size() > kMostLabels) throw KeysError("a host has at most 100 labels");
    return labels;
}

std::vector<std::string> patternsOf(const std::string& text) {
    std::vector<std::string> patterns = splitList(text);
    for (const std::string& pattern : patterns) {
        if (!fitsSelector(pattern, true)) {
            throw KeysError("\"" + pattern + "\" is neither a name nor a pattern such as web-*");
        }
    }
    return patterns;
}

std::string keptLabels(const Labels& labels) {
    return json(labels).dump();
}

Labels labelsKept(const std::string& text) {
    return json::parse(text).get<Labels>();
}

std::string keptTexts(const std::vector<std::string>& texts) {
    return json(texts).dump();
}

std::vector<std::string> textsKept(const std::string& text) {
    return json::parse(text).get<std::vector<std::string>>();
}

}  // namespace fleet
