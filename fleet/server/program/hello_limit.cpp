#include "fleet/server/program/hello_limit.h"

#include <algorithm>

namespace fleet {

bool HelloLimit::admits(const std::string& host, Clock::time_point now) {
    if (hosts_.size() >= kMostHosts) hosts_.clear();
    const auto [entry, isNew] = hosts_.try_emplace(host, Allowance{kBurst, now});
    Allowance& allowance = entry->second;
    const auto passed = std::chrono::duration_cast<std::chrono::seconds>(now - allowance.since);
    if (passed.count() > 0) {
        const auto gained = std::min<std::chrono::seconds::rep>(passed.count(), kBurst);
        allowance.left = std::min(kBurst, allowance.left + static_cast<int>(gained));
        allowance.since = now;
    }
    if (allowance.left == 0) return false;
    --allowance.left;
    return true;
}

}  // namespace fleet
