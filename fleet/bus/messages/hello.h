/// What a link and the centre tell each other every half minute.
///
/// The exchange heals what the bus, a journal or a database has forgotten: see
/// docs/fleet-protocol.md.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "fleet/bus/messages/values.h"

namespace fleet {

/// An order that a host's journal has.
struct HeldOrder {
    std::string order;
    Number number = 0;  ///< 0 if the link no longer knows it
};

/// From the link.
struct Hello {
    std::string session;  ///< made up when the link started
    std::string nonce;    ///< made up for this hello
    std::string machine;  ///< the machine's identity
    Moment time{};
    Number taken = 0;        ///< the last order that the host's journal has a record of
    std::string journal;     ///< the journal for which `taken` holds
    std::string journalNow;  ///< the journal that the host has now; "" while no host answers
    std::string blocked;     ///< why the next order is not handed over; "" if nothing is in the way
    /// The orders in the journal, if the centre has asked for them.
    std::optional<std::vector<HeldOrder>> have;
};

/// From the centre.
struct Reply {
    std::string nonce;  ///< the hello's
    Moment time{};
    Number over = 0;                   ///< all orders up to this one are over
    Number last = 0;                   ///< the highest number given
    std::vector<std::string> open;     ///< orders up to the hello's `taken` without an outcome
    bool forget = false;               ///< the link's memory is older than what it has told before
    bool list = false;                 ///< the next hello shall tell which orders the journal has
    std::string stop;                  ///< why this link must not go on; "" if it may
    std::vector<std::string> revoked;  ///< signing keys of operators that count no longer
};

}  // namespace fleet
