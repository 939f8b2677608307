/// How a child process ended, learnt without reaping it.
#pragma once

#include <sys/types.h>

#include <chrono>
#include <optional>

namespace host {

struct ChildEnd {
    bool bySignal = false;
    int number = 0;  ///< the exit status or the signal
};

/// Waits until the child has ended or the time is over; with no time left it only looks. Leaves the
/// child to whoever reaps it, who must not do so meanwhile. Nothing: it runs, or there is no such
/// child.
std::optional<ChildEnd> awaitChildEnd(pid_t child, std::chrono::steady_clock::time_point until);

}  // namespace host
