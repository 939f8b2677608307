/// How long the centre's lease is surely its own.
#pragma once

#include <atomic>
#include <chrono>

#include "fleet/bus/nats/lease.h"

namespace fleet {

/// Decides when a lease is renewed, when a renewal of which the bus said nothing is asked for
/// again, and when to stop. Another centre waits for a whole term from when it has seen the latest
/// renewal, which is no earlier than when that was asked for: so until a term after that, by this
/// clock, which never goes back, nobody else has it. A margin is for what is already on its way
/// then.
///
/// judge() is for one thread at a time, the rest for any.
class LeaseTerm {
public:
    using Clock = std::chrono::steady_clock;
    using Milliseconds = std::chrono::milliseconds;

    /// `term`: a lease is free when it is older.
    explicit LeaseTerm(Milliseconds term) : term_(term) {}

    /// How long the bus may take for each request, so that there is time for others behind it.
    Milliseconds deadline() const { return term_ / 6; }
    /// Before the end of its term from which on it counts as lost.
    Milliseconds margin() const { return term_ / 15; }
    /// Between two renewals, and after one of which the bus said nothing.
    Milliseconds pause() const { return term_ / 3; }
    Milliseconds pauseOfRepeats() const { return term_ / 120; }

    enum class Next {
        Renew,   ///< after pause()
        Repeat,  ///< after pauseOfRepeats()
        Stop     ///< it is another's, or may be soon
    };
    /// What follows from the answer to a claim or a renewal that was asked for at `asked`, now that
    /// it is `now`.
    Next judge(Lease::State::Kind answer, Clock::time_point asked, Clock::time_point now);

    /// Whether it is surely this centre's.
    bool isOurs(Clock::time_point now) const {
        return now.time_since_epoch().count() < until_.load();
    }
    /// How long ago the latest renewal that was acknowledged was asked for. Only after one.
    Milliseconds age(Clock::time_point now) const;

private:
    const Milliseconds term_;
    std::atomic<Clock::rep> until_{0};  ///< in ticks; 0: it never was
};

}  // namespace fleet
