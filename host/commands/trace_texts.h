/// The trace lines from which the host learns what the plug-in's commands do: their units, and the
/// beginnings of their texts. They stand here and nowhere else; a test compares them with the
/// plug-in.
#pragma once

#include <string_view>

namespace host::trace {

/// Runs commands and collects their output.
inline constexpr char kRunnerUnit[] = "zavutil";
/// Starts the processes and waits for them.
inline constexpr char kProcessUnit[] = "zavprnix";
/// Makes a request's answer.
inline constexpr char kAnswerUnit[] = "zavtqelm";
/// Reads the inventory; its errors only.
inline constexpr char kInventoryUnit[] = "zav03agt";

// ---- The runner, in the order in which its lines come -------------------------------------------

/// Followed by the command line and kCommandEnd.
inline constexpr std::string_view kCommand = "Command to run is \"";
inline constexpr std::string_view kCommandEnd = "\"";
/// In the command line of the translator when it reads or writes a configuration: what it prints
/// then is one, or may repeat one.
inline constexpr std::string_view kReadsConfiguration = "/zav_xa -g ";
inline constexpr std::string_view kWritesConfiguration = "/zav_xa -p ";
/// The process was not started at all.
inline constexpr std::string_view kNotStarted = "Failed to start process for cmd ";
/// Followed by a piece of the standard output, or of the standard error, as it was read.
inline constexpr std::string_view kOutput = "outbuf: ";
inline constexpr std::string_view kErrors = "errbuf: ";
/// The time was over before the command's end or its output's.
inline constexpr std::string_view kTimedOut = "Failed to wait on process";
/// Followed by the exit status, as the plug-in understood it, and ")".
inline constexpr std::string_view kGoodEnd = "Return code (";
inline constexpr std::string_view kBadEnd = "Bad return code (";

// ---- The process --------------------------------------------------------------------------------

/// Followed by the time-out and " seconds".
inline constexpr std::string_view kTimeout = "Set timeout to ";
/// Followed by the path of what is no executable file.
inline constexpr std::string_view kNoProgram = "Unable to execute command: ";
/// Followed by the process id. From here on the plug-in reaps the process.
inline constexpr std::string_view kWaiting = "Waiting for process id: ";
/// The function that traces kWaiting and kills the process without a further look.
inline constexpr std::string_view kGivesUp = "giveUp";

/// Followed by the process id. The time is over; the plug-in is about to kill the process.
inline constexpr std::string_view kGivenUp = "Terminating process group -";

// ---- The child, between fork and exec -----------------------------------------------------------

/// Followed by the process id.
inline constexpr std::string_view kInChild = "Entering child process to launch command. PID: ";
/// Its standard streams are connected.
inline constexpr std::string_view kConnected = "Calling execvp";
/// They could not be connected; it ends.
inline constexpr std::string_view kNotConnected = "error on dup2 for ";
/// errno says why.
inline constexpr std::string_view kNotExecuted = "Unable to launch the executable";

// ---- Others -------------------------------------------------------------------------------------

/// Followed by the request's RETVAL and "]".
inline constexpr std::string_view kAnswer = "Returning status return code [";
/// What the inventory program printed is no inventory.
inline constexpr std::string_view kNoInventory = "Inventory header string ";

// ---- No trace lines, but parts of one: an install that may end the host -------------------------

/// Its command line: this, the depot with kRestartScript at its end, a blank and the command.
inline constexpr std::string_view kRestartShell = "/bin/sh ";
inline constexpr std::string_view kRestartScript = "/runcmd.sh ";
/// Files of the depot that get its outputs.
inline constexpr const char* kRestartOutput = "stdout.txt";
inline constexpr const char* kRestartErrors = "stderr.txt";

}  // namespace host::trace
