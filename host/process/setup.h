/// Process-wide settings.
#pragma once

namespace host {

/// Opens descriptors 0 to 2 if they are closed, keeps broken pipes from ending the process, takes
/// the locale from the environment, and limits what the allocator keeps. Call it first in main(),
/// before any thread exists.
void setUpProcess();

/// Keeps what the process and its children make from being writable by others. Call it while there
/// is one thread.
void takeWritePermissionFromOthers();

}  // namespace host
