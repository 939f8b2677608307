/// What a thread of this process is doing.
#pragma once

#include <sys/types.h>

#include <fstream>
#include <string>

/// Whether the thread waits, as the kernel sees it: for a lock, for another thread or for an event.
/// False when it runs or has ended. The number is that of gettid().
inline bool isAsleep(pid_t thread) {
    std::ifstream file("/proc/self/task/" + std::to_string(thread) + "/stat");
    std::string stat;
    std::getline(file, stat);  // which reads nothing of a thread that ends meanwhile
    // The state follows the name, which stands in brackets and may contain some.
    const std::size_t name = stat.rfind(')');
    return name != std::string::npos && stat.compare(name, 3, ") S") == 0;
}
