/// Start-up: the functions that the host process calls after it has loaded this library.
#pragma once

#include "tasks/home.h"

extern "C" {

/// Reads the home directory from the environment variable "TOVRINHOME", stores it in ZAV_TOVRINHOME
/// and returns it. Returns null, with a trace line, when the variable is not set. An empty value
/// counts as set.
[[gnu::visibility("default")]] const char* Initialize_Tovrin_Home();

/// Starts the library: registers its tables, starts the task manager and registers the file
/// transfer interface. Without a home directory it does nothing, and the library stays inactive.
/// Returns the status of the interface's registration, 0 without a home, or OXA_FAILED when out of
/// memory. Call it once, on one thread. Whatever it starts runs until the process ends. Throws
/// nothing.
[[gnu::visibility("default")]] int Initialize_Mgmt_Functions();

}  // extern "C"
