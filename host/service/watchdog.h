/// Whether the host may say that it is alive.
#pragma once

#include <chrono>
#include <optional>

namespace host {

/// What the host is at.
struct Pulse {
    using Time = std::chrono::steady_clock::time_point;
    std::optional<Time> commandDeadline{};  ///< of the command in hand that has the earliest one
    std::optional<Time> commitBegan{};      ///< of the commit that is being written
};

/// False when the host only seems to be alive: a command has outlived its time by a minute, so that
/// no further task can begin, or a commit has hung for a minute, so that nothing can be accepted.
bool isAlive(const Pulse& pulse, Pulse::Time now);

}  // namespace host
