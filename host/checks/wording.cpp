#include "host/checks/wording.h"

#include <algorithm>
#include <cstddef>

namespace host {
namespace {

constexpr std::size_t kMostNames = 5;

std::string shown(std::string name) {
    std::replace_if(
        name.begin(), name.end(), [](unsigned char c) { return c < ' ' || c == 0x7F; }, '?');
    return name;
}

}  // namespace

std::string listed(std::vector<std::string> names) {
    std::sort(names.begin(), names.end());
    std::string text;
    for (std::size_t i = 0; i < std::min(names.size(), kMostNames); ++i) {
        text += (i == 0 ? "" : ", ") + shown(names[i]);
    }
    if (names.size() > kMostNames) {
        text += " and " + std::to_string(names.size() - kMostNames) + " more";
    }
    return text;
}

}  // namespace host
