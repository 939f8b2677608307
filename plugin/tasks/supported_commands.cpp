#include "tasks/supported_commands.h"

#include <algorithm>

#include "base/zavtrace.h"
#include "tasks/task_state.h"

using ZAV::String;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

// No line is written under the lock, so that no request waits for the trace log of another one.

bool isListed(const String& command) {
    const std::lock_guard<std::mutex> lock(ZAV::commandsMutex);
    return std::find(commands.begin(), commands.end(), command) != commands.end();
}

String listText() {
    String list("Commands supported are: ");
    const char* separator = "";
    const std::lock_guard<std::mutex> lock(ZAV::commandsMutex);
    for (const String& command : commands) {
        list.append(separator).append(command);
        separator = ",";
    }
    return list;
}

}  // namespace

bool isSupportedTask(String command) {
    Trace trace(traceUnit);
    if (isListed(command)) {
        trace().detail("Command %s is supported", command);
        return trace.exit(true);
    }
    trace().error("Command %s is NOT supported", command);
    return trace.exit(false);
}

void getSupportedTasks() {
    Trace trace(traceUnit);
    if (!trace.detailed()) return;
    trace().detail("%s\n", listText());
}
