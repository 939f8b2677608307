// Calls that wait for a thread to give back the lock of a table.

#include <utility>

#include "oxa/internal.h"

namespace oxa {
namespace {

/// One thread may hold the locks of several tables.
thread_local unsigned locksHeld = 0;
thread_local std::vector<std::function<void()>> waiting;

}  // namespace

void tableLocked() {
    ++locksHeld;
}

void tableUnlocked() noexcept {
    if (--locksHeld > 0) return;
    while (!waiting.empty()) {
        const std::vector<std::function<void()>> calls = std::exchange(waiting, {});
        for (const auto& call : calls)
            call();
    }
}

void whenUnlocked(std::function<void()> call) {
    if (locksHeld == 0) {
        call();
    } else {
        waiting.push_back(std::move(call));
    }
}

}  // namespace oxa
