/// What subscribers saw, compared with what the control subscription saw.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "soak/ledger.h"
#include "soak/tally.h"

namespace soak {

/// An equality filter; an empty member or a negative one is not filtered by.
struct EventFilter {
    Ledger::Number number = Ledger::kNone;  ///< stands for its TRANSID; kNone: any
    std::string command;
    std::string target;
    std::string messageId;
    int retval = -1;

    bool matches(const Ledger& ledger, const Ledger::Row& row) const;
    /// The query string's part, each parameter with a "&" before it.
    std::string parameters(const Ledger& ledger) const;
};

/// One subscription from its head to its end.
struct SubscriptionRecord {
    struct Item {
        Ledger::Number number = Ledger::kNone;  ///< kNone: a notice of lost rows
        int retval = 0;
        std::size_t lost = 0;
    };
    EventFilter filter;
    double live = 0;             ///< when its head had come
    std::size_t rowsBefore = 0;  ///< of the control subscription, when it was asked for
    std::size_t cutoff = 0;      ///< rows of the control subscription that it must have got
    std::size_t rowsAfter = 0;   ///< rows that it cannot have got any more
    std::vector<Item> items;
};

/// Holds the record against the ledger: the rows that match its filter, all of them, in the same
/// order, without a gap but the reported ones.
void judgeSubscription(const SubscriptionRecord& record, const Ledger& ledger, Tally& tally);

}  // namespace soak
