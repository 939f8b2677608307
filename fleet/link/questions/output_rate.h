/// How fast a host shows output.
#pragma once

#include <algorithm>
#include <cstddef>

#include "fleet/bus/messages/values.h"

namespace fleet {

/// Spreads messages over time, so that no host fills the bus, whatever its commands write. For all
/// that a host shows together. Times are those of a clock that never goes back. One thread at a
/// time.
class OutputRate {
public:
    static constexpr std::size_t kBytesPerSecond = std::size_t{256} * 1024;
    /// A message costs that much at least, however short it is.
    static constexpr std::size_t kLeastCost = 1024;

    /// How long to wait before a message of so many bytes may go. It has its turn then, so it is to
    /// be asked once for each message.
    Moment pauseBefore(std::size_t bytes, Moment now) {
        constexpr std::size_t kMilliseconds = 1000;
        const std::size_t cost =
            (std::max(bytes, kLeastCost) * kMilliseconds + kBytesPerSecond - 1) / kBytesPerSecond;
        const Moment turn = std::max(free_, now);
        free_ = turn + Moment(static_cast<Moment::rep>(cost));
        return turn - now;
    }

private:
    Moment free_{};  ///< from when on the next one may go
};

}  // namespace fleet
