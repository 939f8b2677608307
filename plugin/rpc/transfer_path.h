/// Names of transferred files: their place in the depot, and whether they lead out of it.
#pragma once

#include "base/zavstr.h"

namespace ZAV {

/// Returns the name relative to the depot: replaces each "\" by "/" and removes one leading "/".
String transferName(const char* fileName);

/// Whether a name (see transferName) leads out of the depot: a ".." climbs above it or follows a
/// symbolic link, after which it could lead anywhere. Links by themselves are allowed, because
/// installers create them in the depot. `depot` ends in "/".
bool leadsOutOfDepot(const String& depot, const String& name);

}  // namespace ZAV
