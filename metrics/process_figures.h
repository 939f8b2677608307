/// What the system says about this process.
#pragma once

#include <optional>

namespace metrics {

/// Absent where the system does not say.
struct ProcessFigures {
    std::optional<double> cpuSeconds;    ///< spent by all threads, in the system too
    std::optional<double> startSeconds;  ///< since the epoch
    std::optional<double> virtualBytes;
    std::optional<double> residentBytes;
    std::optional<double> openDescriptors;
    std::optional<double> mostDescriptors;  ///< that it may have open
    std::optional<double> threads;
};

/// Reads them from /proc. Any thread; some milliseconds.
ProcessFigures readProcessFigures();

}  // namespace metrics
