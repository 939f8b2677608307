#include "tasks/start_stop.h"

#include "base/zavrunas.h"
#include "base/zavtrace.h"
#include "tasks/failure.h"
#include "tasks/home.h"
#include "util/zavutil.h"

using ZAV::String;
using ZAV::Trace;
using ZAV::Util;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

/// The user that the run-as database has for the instance; empty when it has none.
String runAsUser(const String& product, const String& instance) {
    const String path = String(ZAV_TOVRINHOME) + "/config/" + Util::getHostName() + "_zavrunas.cfg";
    const ZAV::StartupDB database(path);
    const ZAV::AgentEntry* const agent = database.getAgent(product);
    if (agent == nullptr) return {};
    const ZAV::InstanceEntry* const entry = agent->getInstance(instance);
    return entry == nullptr ? String() : entry->getUser();
}

String verbFor(const String& action) {
    if (action == "START") return "start";
    if (action == "STOP") return "stop";
    return "oh-oh-not-supported";
}

/// The script's command line. The two blanks before "-h" are intended.
String scriptCommand(const String& action, const String& product, const String& instance) {
    const String home(ZAV_TOVRINHOME);
    String command = home + "/" + "bin" + "/" + "TovrinAgent " + " " + "-h " + home + " ";
    if (action == "STOP") command.append("-c ");
    if (instance.length() != 0) command.append("-o " + instance + " ");
    return command + verbFor(action) + " " + product;
}

String commandLine(const String& action, const String& product, const String& instance) {
    const String user = runAsUser(product, instance);
    const String command = scriptCommand(action, product, instance);
    if (user.length() == 0) return command;
    return String("/bin/") + "su - " + user + " -c \"" + command + "\"";
}

/// Runs the command; traces the reason of a failure.
TASK_RC runScript(const String& command, char** environment) {
    Trace trace(traceUnit);
    int exitCode = 0;
    String stdOut;
    String stdErr;
    if (!Util::runCommandEnv(command, environment, exitCode, stdOut, stdErr, "", false)) {
        trace().error("%s Failed to start command [%s]", rcToMsgId(TASK_START_STOP_NOT_STARTED),
                      command);
        return trace.exit(TASK_START_STOP_NOT_STARTED);
    }
    if (exitCode != 0) {
        trace().error("%s Bad return code from start/stop command [%s]",
                      rcToMsgId(TASK_START_STOP_FAILED), command);
        return trace.exit(TASK_START_STOP_FAILED);
    }
    return trace.exit(TASK_OK);
}

}  // namespace

TASK_RC startstopAgent(const String& action, const String& product, const String& instance,
                       TaskQueueElem* task) {
    Trace trace(traceUnit);
    trace().detail("Attempting to [%s] product code [%s] instance [%s]", action, product, instance);
    const String command = commandLine(action, product, instance);

    // An agent must not trace into the log of the process that started it.
    char noTraceLog[] = "KBB_RAS1_LOG=";
    char* startEnvironment[] = {noTraceLog, nullptr};
    const TASK_RC rc = runScript(command, action == "START" ? startEnvironment : nullptr);
    if (rc != TASK_OK && task != nullptr) setFailure(*task, rc, command);
    trace().detail("Exit with return code [%d]", rc);
    return trace.exit(rc);
}

TASK_RC startAgent(const String& product, const String& instance, TaskQueueElem* task) {
    Trace trace(traceUnit);
    return trace.exit(startstopAgent("START", product, instance, task));
}

TASK_RC stopAgent(const String& product, const String& instance, TaskQueueElem* task) {
    Trace trace(traceUnit);
    return trace.exit(startstopAgent("STOP", product, instance, task));
}

TASK_RC restartAgent(const String& product, const String& instance, TaskQueueElem* task) {
    Trace trace(traceUnit);
    startstopAgent("STOP", product, instance, task);
    return trace.exit(startstopAgent("START", product, instance, task));
}
