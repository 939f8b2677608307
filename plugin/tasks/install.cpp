#include "tasks/install.h"

#include <cstdlib>
#include <initializer_list>
#include <memory>

#include "base/zavtrace.h"
#include "platform/bss1.h"
#include "tasks/failure.h"
#include "tasks/task_state.h"
#include "tasks/translator.h"
#include "tasks/whole_file.h"
#include "tasks/zavtqelm.h"
#include "util/zavutil.h"

using ZAV::String;
using ZAV::Trace;
using ZAV::Util;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

constexpr const char* kRequiresRestart = "REQUIRES_RESTART";

/// Directories that an installation leaves in the depot, besides its own product's.
constexpr const char* kCleanedProducts[] = {"ui", "ci", "jr", "gs", "dd", "ax", "la", "uf", "ux"};

String setCmsCommand(const String& translator, const String& product) {
    return translator + " -setCMS " + product;
}

String scriptLines(std::initializer_list<String> lines) {
    String script;
    for (const String& line : lines) {
        script.append(line).append("\n");
    }
    return script;
}

/// The first lines of both scripts: they ignore the signals that end the agent process, and run
/// their arguments.
String scriptHead() {
    return scriptLines({
        "#!/bin/sh",
        "trap \"true\" 13 15",
        "rm -f " + depotDir + "rc.txt >/dev/null 2>&1",
        "rm -f " + depotDir + "stderr.txt >/dev/null 2>&1",
        "rm -f " + depotDir + "stdout.txt >/dev/null 2>&1",
        "$* 2>" + depotDir + "stderr.txt 1>" + depotDir + "stdout.txt",
        "RETCODE=$?",
    });
}

String scriptCleanUp(const String& product) {
    String lines;
    for (const char* const cleaned : kCleanedProducts) {
        lines.append(scriptLines({"rm -rf " + depotDir + cleaned + " >/dev/null 2>&1"}));
    }
    return lines + scriptLines({"rm -rf " + depotDir + product + " >/dev/null 2>&1"});
}

String scriptTail() {
    return scriptLines({
        "echo $RETCODE > " + depotDir + "rc.txt",
        "exit $RETCODE",
    });
}

String installOnlyScript(const String& product) {
    return scriptHead() + scriptLines({"export RETCODE"}) + scriptCleanUp(product) + scriptTail();
}

String installAndTwoWayScript(const String& product, const String& translatorCommand) {
    const String translation = scriptLines({
        "if [ \"$RETCODE\" -eq \"0\" ]; then",
        translatorCommand + " 2>>" + depotDir + "stderr.txt 1>>" + depotDir + "stdout.txt",
        "RETCODE=$?",
        "fi",
    });
    return scriptHead() + translation + scriptCleanUp(product) + scriptLines({"export RETCODE"}) +
           scriptTail();
}

/// Changes `command` into one that survives a restart of this process. Reports success before the
/// command has begun, because this process may be gone when it ends.
TASK_RC prepareForRestart(String& command, TaskQueueElem& task) {
    Trace trace(traceUnit);
    String translator;
    if (!getTwoWayTranslator(translator)) {
        trace().error("No default two way translator found");
        // Not the message of the returned code: servers rely on this pair.
        setFailure(task, TASK_INSTALL_NOT_STARTED, command);
        return trace.exit(TASK_INSTALL_FAILED);
    }
    String translatorCommand = setCmsCommand(translator, task.getProduct());
    trace().detail("Using Two-Way Translator %s", translatorCommand);
    trace().detail("Generating post install script");
    setupForRestart(command, translatorCommand, task);
    trace().detail("Sleeping for 5 seconds...");
    BSS1_Sleep(5);
    task.returnAsyncStatus(TASK_OK);
    return trace.exit(TASK_OK);
}

/// A patch of these two products leaves processes behind that keep the pipes open, so reading to
/// the end of the output would never finish.
bool needsNonBlockingReads(const String& command, const TaskQueueElem& task) {
    Trace trace(traceUnit);
    String product = task.getProduct();
    product.toLower();
    const bool needed =
        (product == "oy" || product == "or") && command.find("qvspatch", 0) != String::NPOS;
    if (needed) {
        trace().detail("Patch being applied to oy or or, setting nonblocking io flag to true");
    }
    return trace.exit(needed);
}

TASK_RC runInstallCommand(const String& command, TaskQueueElem& task) {
    Trace trace(traceUnit);
    trace().detail("Install command is [%s]", command);
    const bool nonBlocking = needsNonBlockingReads(command, task);
    trace().detail("Executing install command %s", command);
    int exitCode = 0;
    String stdOut;
    String stdErr;
    if (!Util::runCommand(command, exitCode, stdOut, stdErr, "", nonBlocking)) {
        return trace.exit(failTask(trace(), task, TASK_INSTALL_NOT_STARTED, command,
                                   "%s Failed to start install command [%s]", command));
    }
    if (exitCode != 0) {
        return trace.exit(
            failTask(trace(), task, TASK_INSTALL_FAILED, joinValues({command, decimal(exitCode)}),
                     "%s Bad return code [%d] from install command [%s]", exitCode, command));
    }
    trace().detail("Install returned 0 return code.");
    return trace.exit(TASK_OK);
}

TASK_RC runSetCms(TaskQueueElem& task) {
    Trace trace(traceUnit);
    String translator;
    if (!getTwoWayTranslator(translator)) {
        trace().error("No default two way translator found");
        return trace.exit(TASK_INSTALL_FAILED);
    }
    const String command = setCmsCommand(translator, task.getProduct());
    int exitCode = 0;
    String stdOut;
    String stdErr;
    if (!Util::runCommand(command, exitCode, stdOut, stdErr, "", false)) {
        return trace.exit(failTask(trace(), task, TASK_TRANSLATOR_NOT_STARTED,
                                   joinValues({commandAndProduct(task), command}),
                                   "%s Failed to start two way translator [%s]", command));
    }
    if (exitCode != 0) {
        return trace.exit(
            failTask(trace(), task, TASK_TRANSLATOR_FAILED,
                     joinValues({commandAndProduct(task), asCharacter(exitCode), command}),
                     "%s Bad return code [%d] from setCMS command [%s]", exitCode, command));
    }
    trace().detail("SetCMS for product [%s] was successfull.", task.getProduct());
    return trace.exit(TASK_OK);
}

TASK_RC installInSteps(TaskQueueElem& task) {
    Trace trace(traceUnit);
    String command = replaceTokens(task.getContext(), task.getProduct(), task.getVersion());
    const String optional = task.getOptional();
    const bool requiresRestart = optional == kRequiresRestart;
    TASK_RC rc = requiresRestart ? prepareForRestart(command, task) : TASK_OK;
    if (rc == TASK_OK) rc = runInstallCommand(command, task);
    // With a restart, the script has run the translator.
    if (rc == TASK_OK && optional.length() != 0 && !requiresRestart) rc = runSetCms(task);
    return trace.exit(rc);
}

}  // namespace

TASK_RC install(TaskQueueElem& task) {
    Trace trace(traceUnit);
    const TASK_RC rc = installInSteps(task);
    trace().detail("Return code is %d", rc);
    return trace.exit(rc);
}

void setupForRestart(String& command, String& translatorCommand, TaskQueueElem& task) {
    Trace trace(traceUnit);
    const String scriptPath = depotDir + "runcmd.sh";
    String product = task.getProduct();
    product.toLower();
    command = "/bin/sh " + scriptPath + " " + command;
    if (translatorCommand.length() == 0) {
        trace().detail("Constructing install only script %s", command);
        writeFile(scriptPath, installOnlyScript(product));
    } else {
        trace().detail("Constructing install and two-way script %s", command);
        trace().detail("Two Way Translator is: %s", translatorCommand);
        writeFile(scriptPath, installAndTwoWayScript(product, translatorCommand));
    }
}

TASK_RC completeInstallAfterRestart(TaskQueueElem& task) {
    Trace trace(traceUnit);
    BSS1_Sleep(10);
    const String path = depotDir + "rc.txt";
    char* buffer = nullptr;
    const int failure = Util::readFile(path.c_str(), &buffer);
    const std::unique_ptr<char, void (*)(void*)> owner(buffer, &std::free);
    if (failure != 0) {
        trace().error("Unable to read rc.txt for install's return code");
        return trace.exit(setFailure(task, TASK_INSTALL_FAILED, joinValues({path, "NOTFOUND"})));
    }
    // Everything except a number other than 0 counts as success.
    int exitCode = 0;
    if (String::convertToInt(String(buffer).trim(), &exitCode) && exitCode != 0) {
        return trace.exit(
            setFailure(task, TASK_INSTALL_FAILED, joinValues({path, decimal(exitCode)})));
    }
    return trace.exit(TASK_OK);
}
