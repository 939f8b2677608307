/// The universal agent's console, `<home>/bin/um_console`.
#pragma once

#include "base/zavstr.h"

/// The result of one run of the console.
struct ConsoleRun {
    ZAV::String command;   ///< the command line, even when it could not be started
    bool started = false;  ///< it ran and ended within the time-out
    int exitCode = 0;      ///< valid when it was started
    ZAV::String stdOut;
};

/// The agent's settings that the console needs.
struct UaConsole {
    ZAV::String workPath;
    ZAV::String rbPath;
    ZAV::String port;  ///< empty for the console's own default

    /// Runs the console with `verb` ("getdptype", "DELETE" or "IMPORT") and the full path of a
    /// metafile, without asking for confirmation. Blocks until the console has ended.
    ConsoleRun run(const ZAV::String& verb, const ZAV::String& metafile) const;
};
