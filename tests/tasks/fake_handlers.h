/// Replaces all task handlers, to test the task manager without them. The linker takes these
/// definitions before the library's: include this in only one source of a test program.
#pragma once

#include <functional>
#include <mutex>
#include <string>
#include <vector>

#include "tasks/agent_config.h"
#include "tasks/install.h"
#include "tasks/start_stop.h"
#include "tasks/ua_config.h"
#include "tasks/uninstall.h"
#include "tasks/zavtqelm.h"

namespace fake_handlers {

/// Runs in place of every handler; gets the handler's name and the task.
using Behaviour = std::function<TASK_RC(const std::string& handler, TaskQueueElem& task)>;

// Never destroyed: an executor may still be running when the program exits.
inline std::mutex& guard = *new std::mutex;
inline Behaviour& behaviour = *new Behaviour;
inline std::vector<std::string>& recorded = *new std::vector<std::string>;

inline std::string narrow(const ZAV::String& text) {
    return static_cast<const char*>(text.c_str());
}

/// Forgets all calls and lets every handler succeed.
inline void reset() {
    const std::lock_guard<std::mutex> lock(guard);
    recorded.clear();
    behaviour = nullptr;
}

inline void behave(Behaviour next) {
    const std::lock_guard<std::mutex> lock(guard);
    behaviour = std::move(next);
}

/// The calls so far, such as "startAgent ux inst1" or "install tx-1".
inline std::vector<std::string> calls() {
    const std::lock_guard<std::mutex> lock(guard);
    return recorded;
}

inline void record(const std::string& call) {
    const std::lock_guard<std::mutex> lock(guard);
    recorded.push_back(call);
}

inline TASK_RC run(const std::string& handler, const std::string& arguments, TaskQueueElem& task) {
    record(handler + " " + arguments);
    Behaviour current;
    {
        const std::lock_guard<std::mutex> lock(guard);
        current = behaviour;
    }
    return current ? current(handler, task) : TASK_OK;
}

inline TASK_RC runHandler(const std::string& handler, TaskQueueElem& task) {
    return run(handler, narrow(task.getTransid()), task);
}

inline TASK_RC runAction(const std::string& handler, const ZAV::String& product,
                         const ZAV::String& instance, TaskQueueElem* task) {
    return run(handler, narrow(product) + " [" + narrow(instance) + "]", *task);
}

}  // namespace fake_handlers

TASK_RC install(TaskQueueElem& task) {
    return fake_handlers::runHandler("install", task);
}
TASK_RC completeInstallAfterRestart(TaskQueueElem& task) {
    return fake_handlers::runHandler("completeInstallAfterRestart", task);
}
TASK_RC uninstall(TaskQueueElem& task) {
    return fake_handlers::runHandler("uninstall", task);
}
TASK_RC removeInstance(TaskQueueElem& task) {
    return fake_handlers::runHandler("removeInstance", task);
}
TASK_RC setConfig(TaskQueueElem& task) {
    return fake_handlers::runHandler("setConfig", task);
}
TASK_RC getConfig(TaskQueueElem& task) {
    return fake_handlers::runHandler("getConfig", task);
}
TASK_RC setUaconfig(TaskQueueElem& task) {
    return fake_handlers::runHandler("setUaconfig", task);
}
ZAV::String getInstanceName(const ZAV::String& product, const ZAV::String& managedSystemName) {
    fake_handlers::record("getInstanceName " + fake_handlers::narrow(product) + " [" +
                          fake_handlers::narrow(managedSystemName) + "]");
    return managedSystemName.length() == 0 ? ZAV::String() : "instance of " + managedSystemName;
}
TASK_RC startAgent(const ZAV::String& product, const ZAV::String& instance, TaskQueueElem* task) {
    return fake_handlers::runAction("startAgent", product, instance, task);
}
TASK_RC stopAgent(const ZAV::String& product, const ZAV::String& instance, TaskQueueElem* task) {
    return fake_handlers::runAction("stopAgent", product, instance, task);
}
TASK_RC restartAgent(const ZAV::String& product, const ZAV::String& instance, TaskQueueElem* task) {
    return fake_handlers::runAction("restartAgent", product, instance, task);
}
