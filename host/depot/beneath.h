/// Opening files below a directory, whatever a path or a link in it may say.
#pragma once

#include <string>

#include "system/file_descriptor.h"

namespace host {

/// Opens `path` below the directory `root`; "" and "." are the directory itself. Links are followed
/// as long as they stay below it; absolute links and ".." above it are refused, and so are links of
/// the kind that /proc has. `flags` are those of open(2), without O_CREAT; close-on-exec is added.
/// On failure the result is empty and errno says why: EXDEV when the path leads out.
sys::FileDescriptor openBeneath(int root, const std::string& path, int flags);

/// The same on a kernel that cannot do this by itself: component by component.
sys::FileDescriptor walkBeneath(int root, const std::string& path, int flags);

}  // namespace host
