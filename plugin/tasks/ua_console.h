/// The universal agent's console, `<home>/bin/um_console`.
#pragma once

#include "base/zavstr.h"

/// What became of one run of the console.
struct ConsoleRun {
    ZAV::String command;   ///< the command line, whether it could be started or not
    bool started = false;  ///< it ran and ended within the time-out
    int exitCode = 0;      ///< only when it was started
    ZAV::String stdOut;
};

/// What the console needs to know of the agent.
struct UaConsole {
    ZAV::String workPath;
    ZAV::String rbPath;
    ZAV::String port;  ///< empty for the console's own default

    /// Has the console do `verb` ("getdptype", "DELETE" or "IMPORT") with a metafile, given by its
    /// full path. Asks for no confirmation; blocks until the console has ended.
    ConsoleRun run(const ZAV::String& verb, const ZAV::String& metafile) const;
};
