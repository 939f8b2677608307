/// Where the trace log of a service is.
#pragma once

#include <string>

#include "host/process/configuration/environment.h"
#include "host/process/log.h"

namespace host {

/// Whether the trace needs a file of its own: KBB_RAS1_LOG names no place for it, and standard
/// error is read as the log of a service, which trace lines would spoil: it is JSON, or goes to the
/// system's journal, or is the log of a container, whose process 1 this is.
bool wantsTraceFile(LogFormat format, const Environment& environment);

/// Sends the trace to "trace.log" in the state directory, which is made if it is missing. When that
/// file cannot be opened there is a warning and no trace. Throws StartError when there can be no
/// such directory. To be called before anything is traced, while there is one thread.
void traceToFile(const std::string& stateDirectory, const Environment& environment);

}  // namespace host
