/// The line-end conversion of transferred files.
#pragma once

#include "base/zavtrace.h"
#include "rpc/depot_tree.h"

namespace ZAV {

/// The other form of convertDOS2Unix, which finds `path` beneath the depot.
int convertDOS2Unix(DepotTree& depot, const char* path);

/// Does the work of convertDOS2Unix on behalf of `trace`: 0 or -1.
int convertLineEnds(Trace& trace, const char* path);

}  // namespace ZAV
