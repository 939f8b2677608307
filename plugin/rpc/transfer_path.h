/// Names of transferred files: where below the depot they stand, and whether they stay there.
#pragma once

#include "base/zavstr.h"

namespace ZAV {

/// The name relative to the depot: "\" becomes "/", and one leading "/" goes.
String transferName(const char* fileName);

/// Whether a name (see transferName) leads out of the depot: a ".." climbs above it, or undoes a
/// symbolic link, in which case nobody knows where it leads. Links themselves are followed,
/// because installers put them into the depot. `depot` ends in "/".
bool leadsOutOfDepot(const String& depot, const String& name);

}  // namespace ZAV
