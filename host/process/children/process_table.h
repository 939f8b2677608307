/// The processes of the system, as /proc shows them.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <optional>
#include <string_view>
#include <vector>

namespace host {

struct ProcessEntry {
    pid_t pid = 0;
    pid_t parent = 0;
    pid_t session = 0;
    bool isAlive = false;          ///< false: a zombie
    unsigned long long start = 0;  ///< clock ticks since boot: with the pid it names one process
};

/// All processes that can be seen, in no order. One that ends meanwhile may be missing, and so may
/// one that starts meanwhile.
std::vector<ProcessEntry> readProcesses();

/// Nothing if there is none any more.
std::optional<ProcessEntry> readProcess(pid_t pid);

/// Children of this process that live; processes that it has adopted are among them.
std::size_t countLivingChildren();

/// The entry in the text of a file /proc/PID/stat; nothing if the text is not of its form.
std::optional<ProcessEntry> processIn(std::string_view stat);

}  // namespace host
