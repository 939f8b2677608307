/// Start-up of the task manager.
#pragma once

/// Finds the depot directory, fills `commands` and starts the executor. Without a depot directory
/// it only writes a trace line, and every request stays refused. Does nothing when it has succeeded
/// before. One thread at a time; requests may arrive meanwhile.
void zav_taskmgr_init();
