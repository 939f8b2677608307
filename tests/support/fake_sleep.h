/// A test program that links this takes the place of BSS1_Sleep: nothing sleeps, and what would
/// have slept is written down.
#pragma once

#include <functional>
#include <vector>

namespace fake_sleep {

/// The seconds asked for since the last reset(), in order, by all threads.
std::vector<unsigned> slept();
/// Does what a sleeping thread would miss: runs on it in place of each sleep until the next
/// reset().
void whileAsleep(std::function<void()> happening);
void reset();

}  // namespace fake_sleep
