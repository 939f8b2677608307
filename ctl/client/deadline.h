/// Limits on waiting.
#pragma once

#include <chrono>
#include <functional>

namespace ctl {

using Deadline = std::chrono::steady_clock::time_point;

/// Called about once a second while the program waits.
using Ticker = std::function<void()>;

inline Deadline deadlineIn(std::chrono::milliseconds time) {
    return std::chrono::steady_clock::now() + time;
}

}  // namespace ctl
