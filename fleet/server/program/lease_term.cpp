#include "fleet/server/program/lease_term.h"

namespace fleet {

LeaseTerm::Next LeaseTerm::judge(Lease::State::Kind answer, Clock::time_point asked,
                                 Clock::time_point now) {
    if (answer == Lease::State::Kind::Others) {
        until_ = 0;
        return Next::Stop;
    }
    if (answer == Lease::State::Kind::Ours) {
        until_ = (asked + term_ - margin()).time_since_epoch().count();
    }
    if (!isOurs(now)) return Next::Stop;
    return answer == Lease::State::Kind::Ours ? Next::Renew : Next::Repeat;
}

LeaseTerm::Milliseconds LeaseTerm::age(Clock::time_point now) const {
    const Clock::time_point until{Clock::duration(until_.load())};
    return std::chrono::duration_cast<Milliseconds>(now - (until + margin() - term_));
}

}  // namespace fleet
