#include "tasks/uninstall.h"

#include "base/zavstr.h"
#include "base/zavtrace.h"
#include "platform/bss1.h"
#include "tasks/failure.h"
#include "tasks/home.h"
#include "tasks/product_arch.h"
#include "tasks/translator.h"
#include "tasks/zavtqelm.h"
#include "util/zavutil.h"

using ZAV::String;
using ZAV::Trace;
using ZAV::Util;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

TASK_RC runUninstall(TaskQueueElem& task, const String& command) {
    Trace trace(traceUnit);
    int exitCode = 0;
    String stdOut;
    String stdErr;
    if (!Util::runCommand(command, exitCode, stdOut, stdErr, "", false)) {
        return trace.exit(failTask(trace(), task, TASK_UNINSTALL_NOT_STARTED, command,
                                   "%s Failed to start uninstall command [%s]", command));
    }
    if (exitCode != 0) {
        return trace.exit(failTask(
            trace(), task, TASK_UNINSTALL_FAILED, joinValues({command, asCharacter(exitCode)}),
            "%s Bad return code [%d] from uninstall command [%s]", exitCode, command));
    }
    trace().detail("UnInstall returned 0 return code.");
    return trace.exit(TASK_OK);
}

TASK_RC runRemoval(TaskQueueElem& task, const String& translator) {
    Trace trace(traceUnit);
    const String command = translator + " -r " + task.getTargetmsn() + " -pc " + task.getProduct();
    int exitCode = 0;
    String stdOut;
    String stdErr;
    if (!Util::runCommand(command, exitCode, stdOut, stdErr, task.getContext(), false)) {
        return trace.exit(failTask(trace(), task, TASK_TRANSLATOR_NOT_STARTED,
                                   joinValues({commandAndProduct(task), command}),
                                   "%s Failed to start two way translator using command [%s]",
                                   command));
    }
    if (exitCode != 0) {
        return trace.exit(
            failTask(trace(), task, TASK_TRANSLATOR_FAILED,
                     joinValues({commandAndProduct(task), decimal(exitCode), command}),
                     "%s Received bad return code [%d] from two-way translator command [%s]",
                     exitCode, command));
    }
    return trace.exit(TASK_OK);
}

}  // namespace

TASK_RC uninstall(TaskQueueElem& task) {
    Trace trace(traceUnit);
    const String product = task.getProduct();
    const String architecture = getSharedLibArch(product, BSS1_GetEnv("QVS_BINARCH", nullptr));
    if (architecture.length() == 0) {
        return trace.exit(failTask(trace(), task, TASK_NO_ARCHITECTURE, product,
                                   "%s No product architecture found for product [%s]", product));
    }
    const String command =
        String(ZAV_TOVRINHOME) + "/bin/uninstall.sh -i " + product + " " + architecture;
    trace().detail("UnInstall command is [%s]", command);
    const TASK_RC rc = runUninstall(task, command);
    trace().detail("Return code is %d", rc);
    return trace.exit(rc);
}

TASK_RC removeInstance(TaskQueueElem& task) {
    Trace trace(traceUnit);
    String translator;
    const TASK_RC rc =
        getTwoWayTranslator(translator)
            ? runRemoval(task, translator)
            : failTask(trace(), task, TASK_NO_TRANSLATOR, commandAndProduct(task),
                       "%s No two-way translator found for product code [%s]", task.getProduct());
    trace().detail("Return code is %d", rc);
    return trace.exit(rc);
}
