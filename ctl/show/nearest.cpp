#include "ctl/show/nearest.h"

#include <algorithm>
#include <cstddef>

namespace ctl {
namespace {

/// How many letters have to be left out, added, changed or swapped with their neighbour.
std::size_t slips(std::string_view from, std::string_view to) {
    std::vector<std::size_t> beforeLast;
    std::vector<std::size_t> last(to.size() + 1);
    for (std::size_t column = 0; column <= to.size(); ++column)
        last[column] = column;
    for (std::size_t row = 1; row <= from.size(); ++row) {
        std::vector<std::size_t> now(to.size() + 1, row);
        for (std::size_t column = 1; column <= to.size(); ++column) {
            const bool same = from[row - 1] == to[column - 1];
            now[column] = std::min(
                {last[column] + 1, now[column - 1] + 1, last[column - 1] + (same ? 0 : 1)});
            if (row > 1 && column > 1 && from[row - 1] == to[column - 2] &&
                from[row - 2] == to[column - 1]) {
                now[column] = std::min(now[column], beforeLast[column - 2] + 1);
            }
        }
        beforeLast = std::move(last);
        last = std::move(now);
    }
    return last.back();
}

}  // namespace

std::string nearestWord(std::string_view word, const std::vector<std::string>& known) {
    constexpr std::size_t kLongest = 64;  // nobody slips while typing a longer word
    if (word.size() > kLongest) return {};
    std::string nearest;
    std::size_t least = std::max<std::size_t>(1, word.size() / 3) + 1;
    for (const std::string& candidate : known) {
        const std::size_t count = slips(word, candidate);
        if (count >= least) continue;
        least = count;
        nearest = candidate;
    }
    return nearest;
}

std::string suggestion(std::string_view word, const std::vector<std::string>& known) {
    const std::string nearest = nearestWord(word, known);
    return nearest.empty() ? std::string() : "; did you mean \"" + nearest + "\"?";
}

}  // namespace ctl
