/// What the host holds.
#pragma once

#include <sys/types.h>

#include <set>
#include <string>
#include <vector>

#include "soak/soak_home.h"

namespace soak {

struct Gauges {
    long descriptors = 0;
    long threads = 0;
    long children = 0;  ///< zombies included
    long residentKiB = 0;
    /// Files and directories of the run, its logs and pushed files left out.
    std::set<std::string> files;
};

Gauges gaugesOf(pid_t host, const SoakHome& home);

/// The ids of the processes whose parent is `parent`.
std::vector<pid_t> childrenOf(pid_t parent);

/// The parent of a process, 0 when it does not exist.
pid_t parentOf(pid_t process);

}  // namespace soak
