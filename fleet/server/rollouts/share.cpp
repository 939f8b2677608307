#include "fleet/server/rollouts/share.h"

#include <algorithm>
#include <string>

#include "fleet/server/rollouts/rollout_error.h"

namespace fleet {
namespace {

constexpr std::size_t kMostDigits = 7;
constexpr std::size_t kWhole = 100;

bool isPlainNumber(std::string_view text) {
    const bool isShort = !text.empty() && text.size() <= kMostDigits;
    return isShort && (text.size() == 1 || text[0] != '0') &&
           std::all_of(text.begin(), text.end(), [](char c) { return c >= '0' && c <= '9'; });
}

}  // namespace

Share::Share(std::string_view text) {
    std::string_view digits = text;
    if (!digits.empty() && digits.back() == '%') {
        isPercentage_ = true;
        digits.remove_suffix(1);
    }
    insistThat(isPlainNumber(digits), "\"" + std::string(text.substr(0, 40)) +
                                          "\" is neither a number of hosts nor a percentage");
    for (const char digit : digits)
        value_ = value_ * 10 + static_cast<std::size_t>(digit - '0');
    insistThat(!isPercentage_ || value_ <= kWhole,
               "\"" + std::string(text) + "\" is more than all hosts");
}

std::size_t Share::atLeast(std::size_t all) const {
    if (!isPercentage_) return std::min(value_, all);
    return (all * value_ + kWhole - 1) / kWhole;
}

std::size_t Share::atMost(std::size_t all) const {
    return isPercentage_ ? all * value_ / kWhole : value_;
}

}  // namespace fleet
