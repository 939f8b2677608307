/// One command that the plug-in ran, as the host heard of it.
#pragma once

#include <sys/types.h>

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "host/commands/tail.h"

namespace host {

using WallClock = std::chrono::system_clock;

/// Texts are in the local code page, as the command wrote them.
struct Command {
    std::uint64_t number = 0;  ///< of those that were heard, in their order; 0: not known
    std::string line;
    pid_t pid = 0;  ///< 0: there is no process
    WallClock::time_point started{};
    std::optional<WallClock::time_point> ended;  ///< nothing: it runs
    // How it ended, at most one of the three. None of them: not known.
    std::optional<int> exit;
    std::optional<int> signal;
    std::string error;  ///< why it could not be executed
    /// The plug-in's time for it was over. It killed the process unless that had ended by itself.
    bool timedOut = false;
    /// Its process was there, but could execute nothing. The plug-in takes that for success.
    bool executedNothing = false;
    Tail out;
    Tail err;

    /// Whether it failed although the plug-in takes it for a success.
    bool failedUnseen() const { return executedNothing || (signal && !timedOut); }
    /// Whether it ended in any other way than with exit status 0.
    bool failed() const { return timedOut || signal || !error.empty() || (exit && *exit != 0); }
};

/// A piece of what a command wrote.
struct OutputPiece {
    std::uint64_t command;  ///< the command's number
    bool isError;           ///< it came on the standard error
    std::string_view text;
    std::uint64_t end;  ///< how many bytes that output has had with it
};

}  // namespace host
