#include "host/service/trace_log.h"

#include <unistd.h>

#include "embedded/ras1_control.h"
#include "host/journal/state_directory.h"

namespace host {
namespace {

std::string traceVariable(const Environment& environment, const char* name) {
    const char* const value = environment(name);
    return value == nullptr ? "" : value;
}

}  // namespace

bool wantsTraceFile(LogFormat format, const Environment& environment) {
    if (!traceVariable(environment, "KBB_RAS1_LOG").empty()) return false;
    return format == LogFormat::Json || logsToJournal() || ::getpid() == 1;
}

void traceToFile(const std::string& stateDirectory, const Environment& environment) {
    provideStateDirectory(stateDirectory);
    const std::string selection = traceVariable(environment, "KBB_RAS1");
    const std::string file = stateDirectory + "/trace.log";
    ras1::configure(selection, file);
    // It opens the file once more, and tells whether that is possible.
    if (ras1::reopenLog()) return;
    ras1::configure(selection, "/dev/null");
    say(Priority::Warning, "the trace log " + file + " cannot be opened; nothing is traced");
}

}  // namespace host
