/// The file that trace lines go to.
#pragma once

#include <cstdint>
#include <string>

namespace ras1 {

/// Duplicates a descriptor to a number above those of the standard streams; -1 on failure. If the
/// process closes descriptor 2 and a file or pipe gets that number, traces must not end up there.
/// Nor may the log become a child's standard stream.
int ownDescriptor(int descriptor);

/// Opens a log for appending, with such a descriptor; -1 when it cannot be opened. Follows no link
/// in its place and waits for no pipe: who may write to the directory must not choose what is
/// appended to.
int openLog(const std::string& path);

/// The bytes of a regular file; 0 for anything else.
std::uint64_t sizeOf(int descriptor);

/// Calls the log `path`.1, what was called that `path`.2, and so on; the last of the `kept` older
/// ones, at least one, is dropped. False when the log keeps its name.
bool shiftLogs(const std::string& path, int kept);

}  // namespace ras1
