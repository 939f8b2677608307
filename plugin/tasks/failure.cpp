#include "tasks/failure.h"

#include <string>

using ZAV::String;

String joinValues(std::initializer_list<String> values) {
    String joined;
    const char* separator = "";
    for (const String& value : values) {
        joined.append(separator).append(value);
        separator = ",";
    }
    return joined;
}

String decimal(int number) {
    return String(std::to_string(number).c_str());
}

String asCharacter(int number) {
    String text;
    text.append(static_cast<unsigned short>(number));
    return text;
}

String commandAndProduct(const TaskQueueElem& task) {
    return joinValues({task.getCommand(), task.getProduct()});
}

TASK_RC setFailure(TaskQueueElem& task, TASK_RC rc, const String& parameter) {
    task.setRetmsgid(rcToMsgId(rc));
    task.setRetmsgparm(parameter);
    return rc;
}
