/// Tasks that an end of the host has cut off.
#pragma once

#include <string>

#include "host/api/services.h"

namespace host {

/// What the home's inventory program shows of the task's product now, as the end of a sentence that
/// begins with "; ". Empty for a task without a product. Takes as long as that program, at most ten
/// seconds.
std::string inventoryNow(const Services& services, const Task& task);

/// Adds that to the reason of the task that the last end of the host interrupted, if there is one
/// that does not run again. Call it when nothing of it lives any more. Throws NotKept and
/// DatabaseError.
void describeInterrupted(Services& services);

}  // namespace host
