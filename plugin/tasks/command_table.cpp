#include "tasks/command_table.h"

#include "tasks/agent_config.h"
#include "tasks/install.h"
#include "tasks/start_stop.h"
#include "tasks/ua_config.h"
#include "tasks/uninstall.h"

using ZAV::String;

namespace {

String instanceOf(const TaskQueueElem& task) {
    return getInstanceName(task.getProduct(), task.getTargetmsn());
}

TASK_RC start(TaskQueueElem& task) {
    const bool targetIsInstance = task.getOptional() == "INSTANCE";
    const String instance = targetIsInstance ? task.getTargetmsn() : instanceOf(task);
    return startAgent(task.getProduct(), instance, &task);
}

TASK_RC stop(TaskQueueElem& task) {
    return stopAgent(task.getProduct(), instanceOf(task), &task);
}

TASK_RC restart(TaskQueueElem& task) {
    return restartAgent(task.getProduct(), instanceOf(task), &task);
}

TASK_RC configure(TaskQueueElem& task) {
    return isUniversalAgent(task) ? setUaconfig(task) : setConfig(task);
}

constexpr RequiredParameter product{"PRODUCT", &TaskQueueElem::getProduct, TASK_NO_PRODUCT};
constexpr RequiredParameter version{"VERSION", &TaskQueueElem::getVersion, TASK_NO_VERSION};
constexpr RequiredParameter context{"CONTEXT", &TaskQueueElem::getContext, TASK_NO_CONTEXT};
constexpr RequiredParameter target{"TARGETMSN", &TaskQueueElem::getTargetmsn, TASK_NO_TARGETMSN};

constexpr UniversalAgent likewise = UniversalAgent::Likewise;

}  // namespace

// COMPLETE_INSTALL starts no command of its own. Its only failure says that the install command
// ended badly or in an unknown way, which fits a completion that an exception has ended, too.
const std::array<Command, 9> commandTable{{
    {"START", {product}, likewise, nullptr, start, TASK_START_STOP_NOT_STARTED},
    {"STOP", {product}, likewise, nullptr, stop, TASK_START_STOP_NOT_STARTED},
    {"RESTART", {product}, likewise, nullptr, restart, TASK_START_STOP_NOT_STARTED},
    {"INSTALL", {product, version, context}, likewise, nullptr, install, TASK_INSTALL_NOT_STARTED},
    {"UNINSTALL", {product}, likewise, nullptr, uninstall, TASK_UNINSTALL_NOT_STARTED},
    {"GETCONFIG", {product}, likewise, getConfig, nullptr, TASK_TRANSLATOR_NOT_STARTED},
    {"SETCONFIG",
     {product, context},
     UniversalAgent::RequiresNothing,
     nullptr,
     configure,
     TASK_TRANSLATOR_NOT_STARTED},
    {"COMPLETE_INSTALL", {}, likewise, completeInstallAfterRestart, nullptr, TASK_INSTALL_FAILED},
    {"REMOVEINSTANCE",
     {product, target},
     UniversalAgent::Refused,
     nullptr,
     removeInstance,
     TASK_TRANSLATOR_NOT_STARTED},
}};

const Command* findCommand(const String& name) {
    for (const Command& command : commandTable) {
        if (name == command.name) return &command;
    }
    return nullptr;
}

bool isUniversalAgent(const TaskQueueElem& task) {
    return task.getProduct().toLower() == "um";
}
