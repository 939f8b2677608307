/// What a process has used so far.
#pragma once

#include <sys/types.h>

namespace fleet_programs {

struct ProcessFigures {
    long residentKiB = 0;
    long peakKiB = 0;  ///< the most that was resident at one time
    long threads = 0;
    double processorSeconds = 0;
};

/// All zero for a process that has ended.
ProcessFigures figuresOf(pid_t process);

}  // namespace fleet_programs
