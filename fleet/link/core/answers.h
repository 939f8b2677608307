/// What became of the actions that a link's program has carried out.
#pragma once

#include <string>
#include <variant>

#include "fleet/bus/messages/outcome.h"

namespace fleet {

/// A host gave a record of the order: it is in its journal. `isOver` tells whether its task is
/// over.
struct Recorded {
    bool isOver;
};
/// The host will never take it, and says why. Nothing was recorded.
struct Unacceptable {
    std::string words;
};
/// Not now: the host is away, busy or full. Nothing was recorded.
struct NotNow {
    std::string why;
};
/// The host has another journal than the one that was meant.
struct OtherJournal {};
using HandOverAnswer = std::variant<Recorded, Unacceptable, NotNow, OtherJournal>;

/// The files lie where they belong.
struct FilesPlaced {};
using PrepareAnswer = std::variant<FilesPlaced, Unacceptable, NotNow>;

/// The task of the order will not run or was ended, because of this cancel or an earlier one.
struct WasCancelled {};
/// It cannot be cancelled, and why: it is over, or the journal has no such task.
struct NotCancelled {
    std::string words;
};
using CancelAnswer = std::variant<WasCancelled, NotCancelled, NotNow>;

/// It waits or runs.
struct StillOpen {};
/// The journal has no trace of it.
struct Absent {};
using LookUpAnswer = std::variant<Outcome, StillOpen, Absent, NotNow>;

}  // namespace fleet
