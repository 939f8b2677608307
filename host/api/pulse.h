/// Whether the host is alive, or only seems to be.
#pragma once

#include <chrono>
#include <optional>
#include <vector>

namespace host {

class Journal;

/// What the host is at.
struct Pulse {
    using Time = std::chrono::steady_clock::time_point;
    std::optional<Time> commandDeadline{};  ///< of the command in hand that has the earliest one
    std::optional<Time> commitBegan{};      ///< of the commit that is being written
};

/// What a host hangs in, and what that means.
struct Hang {
    const char* part;  ///< "command" or "journal"
    const char* text;  ///< a sentence
};

/// Any thread; takes no lock that a commit holds.
Pulse pulseOf(const Journal& journal);

/// Nothing for a host that is alive. A command that has outlived its time by a minute lets no
/// further task begin; while a commit has hung for a minute nothing can be accepted.
std::vector<Hang> hangsOf(const Pulse& pulse, Pulse::Time now);

}  // namespace host
