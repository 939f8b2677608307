/// The line-end conversion of files in the depot.
#pragma once

#include "rpc/depot_tree.h"

namespace ZAV {

/// The other form of convertDOS2Unix, which finds `path` beneath the depot.
int convertDOS2Unix(DepotTree& depot, const char* path);

}  // namespace ZAV
