/// Descriptors of processes.
#pragma once

#include <sys/syscall.h>
#include <sys/types.h>
#include <unistd.h>

#include "system/file_descriptor.h"

namespace host {

/// A descriptor that is readable once the process has ended. None, with errno set, if there is no
/// such process or the kernel has no such descriptors.
inline sys::FileDescriptor openPidfd(pid_t process) {
    // Older C libraries do not have the name; the number is the same on every architecture.
#ifdef SYS_pidfd_open
    constexpr long kCall = SYS_pidfd_open;
#else
    constexpr long kCall = 434;
#endif
    return sys::FileDescriptor(static_cast<int>(::syscall(kCall, process, 0)));
}

}  // namespace host
