#include "tasks/required_parameter.h"

#include "base/zavtrace.h"
#include "tasks/failure.h"

using ZAV::String;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

}  // namespace

TASK_RC requiredParameterOk(const String& name, const String& value, TaskQueueElem& task,
                            TASK_RC current, TASK_RC failure) {
    Trace trace(traceUnit);
    if (value.length() != 0) return trace.exit(current);
    return trace.exit(failTask(trace(), task, failure, String(),
                               "%s No [%s] specified, it is a required parameter", name));
}
