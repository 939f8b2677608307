/// Start-up: what the host process calls after loading this library.
#pragma once

#include "tasks/home.h"

extern "C" {

/// Finds the home directory by the environment variable "TOVRINHOME" and keeps it in
/// ZAV_TOVRINHOME. Returns it; null, and a trace line, when the variable is not set. An empty value
/// counts as set.
[[gnu::visibility("default")]] const char* Initialize_Tovrin_Home();

/// Starts the library: registers its tables, starts the task manager and registers the file
/// transfer interface. Without a home directory it does nothing, and the library stays inert.
/// Returns the status of the interface's registration, 0 without a home, OXA_FAILED when there was
/// no memory to finish. Called once, on one thread; nothing that it starts ends before the process
/// does. Throws nothing.
[[gnu::visibility("default")]] int Initialize_Mgmt_Functions();

}  // extern "C"
