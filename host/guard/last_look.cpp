#include "host/guard/last_look.h"

#include <algorithm>
#include <utility>

namespace host {
namespace {

bool isSame(const oxa::Predicate& one, const oxa::Predicate& other) {
    return one.op == other.op && one.column == other.column && one.value == other.value;
}

}  // namespace

void LastLook::keep(const CommandRequest& request, Clock::time_point when) {
    Look look{request.conditions(), request.force(), when};
    const std::lock_guard lock(lock_);
    look_ = std::move(look);
}

bool LastLook::take(const CommandRequest& request, Clock::time_point now) {
    std::optional<Look> look;
    std::optional<Clock::time_point> before = now;
    {
        const std::lock_guard lock(lock_);
        look.swap(look_);
        before.swap(taken_);
    }
    if (!look || now - look->when > kHolds) return false;
    if (before && look->when - *before < kHolds) return false;
    const auto& asked = request.conditions();
    return look->force == request.force() &&
           std::equal(look->conditions.begin(), look->conditions.end(), asked.begin(), asked.end(),
                      isSame);
}

}  // namespace host
