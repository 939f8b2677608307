/// Lets the host process configure the embedded trace. Tests capture traces with it.
#pragma once

#include <cstdint>
#include <string>

namespace ras1 {

/// Replaces the settings that KBB_RAS1 and KBB_RAS1_LOG gave at the start. `selection` has the form
/// of KBB_RAS1: "ALL", "ERROR", or a level followed by groups such as "ERROR (UNIT:zavtasks ALL)".
/// A group selects units by the beginning of their names. Lines are appended to the file `logPath`;
/// they go to standard error if it is empty or the file cannot be opened. What is no regular file
/// and not the null device, or a symbolic link, is not opened. Does not change the environment. To
/// be called by one thread at a time; lines that other threads write meanwhile go to the old or the
/// new place.
void configure(const std::string& selection, const std::string& logPath);

/// Opens the file that lines go to anew under its name, for instance after it was renamed. Returns
/// false, and lines go where they went, when it cannot be opened. Does nothing for standard error.
/// To be called as configure() is.
bool reopenLog();

/// Bounds the file that lines go to: one that has got `bytes` long is renamed, and a new one begun.
/// `kept` older ones stay, at least one, called like it with ".1", ".2" and so on, the newest
/// first; 0 bytes are no limit, as at the start. Lines of children that have not executed their
/// program yet may go a little beyond. Any thread.
void limitLog(std::uint64_t bytes, int kept);

/// Returns to the settings of the environment as it is now.
void configureFromEnvironment();

/// Whether the log shows secrets as they are; off at the start. Off, it has "***" in the place of
/// configurations that are set or read, and of what follows "password", "passwd", "pwd", "secret",
/// "token", "apikey" or "key" and "=" or ":". Listeners always hear the true text. Any thread.
void showSecrets(bool shown);

}  // namespace ras1
