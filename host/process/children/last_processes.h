/// What still runs when a host ends that is process 1.
#pragma once

#include <chrono>
#include <cstddef>

namespace host {

/// As process 1: kills what has the host's session, as the commands of a task in hand have: what
/// starts an agent must not see it end and tidy up behind it. Sends SIGTERM to the processes that
/// have a session of their own, as agents do, and waits until they have ended, for `patience` at
/// most. Returns how many live then; the kernel kills them when this process ends. Any other
/// process leaves its agents alone: does nothing, returns 0.
std::size_t endLastProcesses(std::chrono::milliseconds patience);

}  // namespace host
