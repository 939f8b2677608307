#include "fleet/server/rollouts/waves.h"

#include <algorithm>
#include <string>

#include "fleet/server/rollouts/rollout_error.h"
#include "fleet/server/rollouts/share.h"

namespace fleet {
namespace {

constexpr std::size_t kMostWaves = 100;

std::vector<Share> entriesOf(std::string_view text) {
    std::vector<Share> entries;
    while (true) {
        const std::size_t comma = text.find(',');
        entries.emplace_back(text.substr(0, comma));
        insistThat(entries.back().value() > 0, "a wave must have at least one host");
        insistThat(entries.size() <= kMostWaves, "there are more than 100 waves");
        if (comma == std::string_view::npos) return entries;
        text.remove_prefix(comma + 1);
    }
}

/// Numbers are compared with numbers, and percentages with percentages, wherever they stand.
void insistThatTheyRise(const std::vector<Share>& entries) {
    std::size_t highest[2] = {0, 0};
    for (const Share& entry : entries) {
        std::size_t& before = highest[entry.isPercentage() ? 1 : 0];
        insistThat(entry.value() > before, "each wave must reach more hosts than the one before");
        before = entry.value();
    }
}

}  // namespace

std::vector<std::size_t> wavesOf(std::string_view text, std::size_t all) {
    const std::vector<Share> entries = entriesOf(text);
    insistThatTheyRise(entries);
    std::vector<std::size_t> waves;
    for (const Share& entry : entries) {
        const std::size_t reached = entry.atLeast(all);
        if (reached > (waves.empty() ? 0 : waves.back())) waves.push_back(reached);
    }
    if (all > (waves.empty() ? 0 : waves.back())) waves.push_back(all);
    return waves;
}

}  // namespace fleet
