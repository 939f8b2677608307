/// What the end of an order means for its roll-out.
#pragma once

#include "fleet/bus/messages/values.h"

namespace fleet {

// Ends that the roll-outs know by name, besides kUnknown.
inline constexpr const char* kDone = "done";
inline constexpr const char* kCancelled = "cancelled";
inline constexpr const char* kRefused = "refused";
inline constexpr const char* kExpired = "expired";

/// Whether an end is a sign that going on would do harm, and so counts against the failures that
/// a plan allows. Everything is, but for three:
///
///   done       success
///   cancelled  somebody wanted that; it says nothing about what the order would have done
///   expired    the host was away or busy for longer than the order was good for. Nothing ran, so
///              it is like a host that is still away, which counts neither way
///
/// "unknown" is one: an order that took the host's journal with it must not reach all hosts. So
/// is a state that this centre has never heard of.
bool isFailure(const EndState& end);

/// Whether an order that ended so is tried again when those that failed are. One of which nobody
/// knows whether it ran only if that is forced: it may run twice. One that was cancelled never.
bool mayTryAgain(const EndState& end, bool isForced);

}  // namespace fleet
