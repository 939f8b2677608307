/// What the process does for itself before anything else.
#pragma once

namespace host {

/// Descriptors 0 to 2 are open, no broken pipe ends the process, the locale is the environment's
/// and the allocator keeps few arenas. For the start of main(), before there are threads.
void setUpProcess();

}  // namespace host
