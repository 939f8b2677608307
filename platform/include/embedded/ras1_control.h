/// Control of the embedded trace facility by the process it runs in; tests capture traces with it.
#pragma once

#include <string>

namespace ras1 {

/// Replaces what KBB_RAS1 and KBB_RAS1_LOG said at the start. `selection` has the form of KBB_RAS1:
/// "ALL", "ERROR", or a level followed by groups such as "ERROR (UNIT:zavtasks ALL)", in which a
/// unit is selected by the beginning of its name. Lines are appended to the file `logPath`, or go
/// to standard error when it is empty or cannot be opened. The environment is left alone. One
/// thread at a time; a line that another thread is writing meanwhile goes to the old or to the new
/// place.
void configure(const std::string& selection, const std::string& logPath);

/// Goes back to what the environment says now.
void configureFromEnvironment();

}  // namespace ras1
