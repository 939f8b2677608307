/// What a centre counts while it works, for whoever watches it.
#pragma once

#include "fleet/server/core/records.h"
#include "metrics/by_label.h"
#include "metrics/counter.h"
#include "metrics/histogram.h"

namespace fleet {

/// Counts begin at 0 with the process. Any thread.
class CentreCounts {
public:
    CentreCounts();

    /// An order has got its first outcome, or a real one in the place of "unknown".
    void noteOutcome(const OrderRecord& order, const EndState& state);

    /// Calls `visit` with a command, the state in which orders ended, and their number.
    template <typename Visit>
    void eachOutcome(const Visit& visit) const {
        outcomes_.each([&](std::string_view command, const auto& states) {
            states.each([&](std::string_view state, const metrics::Counter& counter) {
                visit(command, state, counter.value());
            });
        });
    }

    metrics::Counter published;   ///< orders that the bus has stored
    metrics::Counter foundThere;  ///< orders that stood on the bus already, with the same bytes
    metrics::Counter unanswered;  ///< tries of which the bus said nothing, or that it refused
    metrics::Counter alarms;      ///< of hosts
    metrics::Counter hellos;      ///< answered ones
    metrics::Counter unheard;     ///< hellos that came too fast, or while too many waited
    metrics::Counter renewals;    ///< of the lease
    metrics::Counter repeatedRenewals;  ///< tries of which the bus said nothing
    metrics::Counter failedCommits;
    metrics::Histogram commits;  ///< how long transactions took that changed something

private:
    metrics::ByLabel<metrics::ByLabel<metrics::Counter>> outcomes_;
};

}  // namespace fleet
