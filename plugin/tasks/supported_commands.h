/// Which commands requests may name: `commands`, read under its lock.
#pragma once

#include "base/zavstr.h"

/// Whether `command` is in `commands`, spelled exactly so. Any thread.
bool isSupportedTask(ZAV::String command);

/// Traces the list of the supported commands, at detail level. Any thread.
void getSupportedTasks();
