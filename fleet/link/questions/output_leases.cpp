#include "fleet/link/questions/output_leases.h"

#include <iterator>

namespace fleet {

bool OutputLeases::begin(const std::string& stream, Moment now) {
    for (auto one = lasting_.begin(); one != lasting_.end();)
        one = one->second <= now ? lasting_.erase(one) : std::next(one);
    return lasting_.size() < kMost && lasting_.emplace(stream, now + kOutputGoodFor).second;
}

bool OutputLeases::renew(const std::string& stream, Moment now) {
    if (!isWanted(stream, now)) return false;
    lasting_[stream] = now + kOutputGoodFor;
    return true;
}

bool OutputLeases::isWanted(const std::string& stream, Moment now) const {
    const auto found = lasting_.find(stream);
    return found != lasting_.end() && found->second > now;
}

}  // namespace fleet
