#include "ras1/selection.h"

#include <cstring>

#include "platform/ras1.h"

namespace ras1 {
namespace {

constexpr unsigned kAllLevels = RAS1_DETAIL | RAS1_FLOW | RAS1_ERROR;

unsigned levelNamed(const std::string& word) {
    if (word == "ALL") return kAllLevels;
    if (word == "DETAIL") return RAS1_DETAIL | RAS1_ERROR;
    if (word == "FLOW") return RAS1_FLOW | RAS1_ERROR;
    if (word == "ERROR") return RAS1_ERROR;
    return 0;
}

std::vector<std::string> words(const std::string& text) {
    std::vector<std::string> found;
    std::string word;
    for (const char c : text + " ") {
        if (c != ' ' && c != '\t') {
            word += c;
        } else if (!word.empty()) {
            found.push_back(word);
            word.clear();
        }
    }
    return found;
}

/// Adds the rule of a group, "UNIT:name LEVEL ..." without its parentheses. Ignores other groups.
void addGroup(const std::string& group, Selection& selection) {
    std::string unit;
    unsigned flags = 0;
    for (const std::string& word : words(group)) {
        if (word.rfind("UNIT:", 0) == 0) {
            unit = word.substr(5);
        } else {
            flags |= levelNamed(word);
        }
    }
    if (!unit.empty()) selection.rules.push_back({unit, flags});
}

}  // namespace

unsigned Selection::flagsOf(const char* unit) const {
    for (const Rule& rule : rules) {
        if (std::strncmp(unit, rule.unitPrefix.c_str(), rule.unitPrefix.size()) == 0) {
            return rule.flags;
        }
    }
    return general;
}

Selection parseSelection(const std::string& text) {
    Selection selection{RAS1_ERROR, {}};
    unsigned general = 0;
    std::string outside;
    std::size_t at = 0;
    while (at < text.size()) {
        const std::size_t open = text.find('(', at);
        outside += text.substr(at, open == std::string::npos ? open : open - at) + " ";
        if (open == std::string::npos) break;
        const std::size_t close = text.find(')', open);
        const std::size_t end = close == std::string::npos ? text.size() : close;
        addGroup(text.substr(open + 1, end - open - 1), selection);
        at = end + 1;
    }
    for (const std::string& word : words(outside))
        general |= levelNamed(word);
    if (general != 0) selection.general = general;
    return selection;
}

}  // namespace ras1
