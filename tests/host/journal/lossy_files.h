/// A file layer for SQLite that forgets, as a power loss does, whatever was not synced.
#pragma once

/// From now on the databases that this process opens write to memory, and to their files only when
/// they are synced. When the process ends without that, the files are as after a power loss.
void writeOnlyWhatIsSynced();
