#include "text/nearest_name.h"

#include <algorithm>
#include <cctype>
#include <cstddef>
#include <numeric>

namespace text {
namespace {

/// Names are short; longer texts are not names, and comparing them would take long.
constexpr std::size_t kLongestGiven = 64;
constexpr std::size_t kLettersPerSlip = 3;

std::string inLowerCase(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    return text;
}

/// The number of slips between two texts. Row by row of the usual table, of which the two rows
/// above the current one are needed.
std::size_t slipsBetween(const std::string& a, const std::string& b) {
    std::vector<std::size_t> beforeLast(b.size() + 1);
    std::vector<std::size_t> last(b.size() + 1);
    std::vector<std::size_t> row(b.size() + 1);
    std::iota(last.begin(), last.end(), std::size_t{0});
    for (std::size_t i = 1; i <= a.size(); ++i) {
        row[0] = i;
        for (std::size_t j = 1; j <= b.size(); ++j) {
            const std::size_t replaced = last[j - 1] + (a[i - 1] == b[j - 1] ? 0 : 1);
            row[j] = std::min({replaced, last[j] + 1, row[j - 1] + 1});
            const bool swapped = i > 1 && j > 1 && a[i - 1] == b[j - 2] && a[i - 2] == b[j - 1];
            if (swapped) row[j] = std::min(row[j], beforeLast[j - 2] + 1);
        }
        beforeLast.swap(last);
        last.swap(row);
    }
    return last[b.size()];
}

}  // namespace

std::string nearestName(const std::string& given, const std::vector<std::string>& known) {
    if (given.empty() || given.size() > kLongestGiven) return "";
    const std::string wanted = inLowerCase(given);
    std::string nearest;
    std::size_t fewest = std::max<std::size_t>(1, given.size() / kLettersPerSlip) + 1;
    for (const std::string& name : known) {
        const std::size_t slips = slipsBetween(wanted, inLowerCase(name));
        if (slips >= fewest) continue;
        fewest = slips;
        nearest = name;
    }
    return nearest;
}

}  // namespace text
