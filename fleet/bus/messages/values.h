/// The values that the fleet's messages are made of.
#pragma once

#include <chrono>
#include <cstdint>
#include <string>

namespace fleet {

/// The place of an order among all that its host was ever given: 1, 2, 3... 0 is none.
using Number = std::uint64_t;

/// Numbers stay where every JSON reader can hold them exactly.
constexpr Number kHighestNumber = (Number{1} << 53) - 1;

/// A point in time, since the beginning of 1970 in UTC.
using Moment = std::chrono::milliseconds;

/// This machine's clock. It may be wrong, and somebody may put it back.
inline Moment wallClock() {
    return std::chrono::duration_cast<Moment>(std::chrono::system_clock::now().time_since_epoch());
}

/// How an order ended: the state of the host's task, or kUnknown.
using EndState = std::string;

/// The host's journal has no trace of an order that the host once took: nobody can tell whether it
/// ran.
constexpr const char* kUnknown = "unknown";

}  // namespace fleet
