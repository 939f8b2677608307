/// What the system says about this process.
#pragma once

#include <optional>

namespace host {

/// Absent where the system does not say.
struct ProcessFigures {
    std::optional<double> cpuSeconds;    ///< spent by all threads, in the system too
    std::optional<double> startSeconds;  ///< since the epoch
    std::optional<double> virtualBytes;
    std::optional<double> residentBytes;
    std::optional<double> openDescriptors;
    std::optional<double> mostDescriptors;  ///< that it may have open
    std::optional<double> threads;
    std::optional<double> children;  ///< that live; processes that it has adopted are among them
};

/// Reads them from /proc. Any thread; some milliseconds.
ProcessFigures readProcessFigures();

}  // namespace host
