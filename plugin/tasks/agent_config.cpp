#include "tasks/agent_config.h"

#include "base/zavtrace.h"
#include "tasks/failure.h"
#include "tasks/translator.h"
#include "tasks/ua_files.h"
#include "tasks/zavtqelm.h"
#include "util/zavutil.h"

using ZAV::String;
using ZAV::Trace;
using ZAV::Util;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

/// One run of the two-way translator.
struct TranslatorRun {
    String command;
    bool started = false;
    int exitCode = 0;
    String stdOut;
    String stdErr;
};

/// The blanks are part of the option, so without a target there are two of them in a row.
TranslatorRun runTranslator(const String& translator, const String& option, const String& target,
                            const String& product, const String& input) {
    TranslatorRun run;
    run.command = translator + option + target + " -pc " + product;
    run.started = Util::runCommand(run.command, run.exitCode, run.stdOut, run.stdErr, input, false);
    return run;
}

TASK_RC failWithoutTranslator(const Trace::Place& place, TaskQueueElem& task) {
    return failTask(place, task, TASK_NO_TRANSLATOR, commandAndProduct(task),
                    "%s No two-way translator found for product code [%s]", task.getProduct());
}

TASK_RC failUnstarted(const Trace::Place& place, TaskQueueElem& task, const TranslatorRun& run) {
    return failTask(place, task, TASK_TRANSLATOR_NOT_STARTED,
                    joinValues({commandAndProduct(task), run.command}),
                    "%s Failed to start two way translator using command [%s]", run.command);
}

TASK_RC setByTranslator(TaskQueueElem& task) {
    Trace trace(traceUnit);
    String translator;
    if (!getTwoWayTranslator(translator)) return trace.exit(failWithoutTranslator(trace(), task));
    const TranslatorRun run = runTranslator(translator, " -p ", task.getTargetmsn(),
                                            task.getProduct(), task.getContext());
    if (!run.started) return trace.exit(failUnstarted(trace(), task, run));
    if (run.exitCode == 0) return trace.exit(TASK_OK);
    return trace.exit(failTask(
        trace(), task, TASK_TRANSLATOR_FAILED,
        joinValues({commandAndProduct(task), decimal(run.exitCode), run.command, run.stdErr}),
        "%s Received bad return code [%d] from two-way translator command [%s], STDERR=[%s]",
        run.exitCode, run.command, run.stdErr));
}

/// Drops what the translator printed before the configuration itself.
String configurationIn(const String& output) {
    const std::uint32_t begin = output.find("INSTANCE=", 0);
    return begin == String::NPOS ? String() : output.substr(begin);
}

TASK_RC getByTranslator(TaskQueueElem& task) {
    Trace trace(traceUnit);
    String translator;
    if (!getTwoWayTranslator(translator)) return trace.exit(failWithoutTranslator(trace(), task));
    const TranslatorRun run =
        runTranslator(translator, " -g ", task.getTargetmsn(), task.getProduct(), "");
    if (!run.started) return trace.exit(failUnstarted(trace(), task, run));
    if (run.exitCode != 0) {
        return trace.exit(
            failTask(trace(), task, TASK_TRANSLATOR_FAILED,
                     joinValues({commandAndProduct(task), decimal(run.exitCode), run.command}),
                     "%s Received bad return code [%d] from two-way translator command [%s]",
                     run.exitCode, run.command));
    }
    task.setContext(configurationIn(run.stdOut));
    return trace.exit(TASK_OK);
}

String instanceByTranslator(const String& product, const String& managedSystemName) {
    Trace trace(traceUnit);
    String translator;
    if (!getTwoWayTranslator(translator)) {
        trace().error("No two-way translator found for product code [%s]", product);
        return {};
    }
    const TranslatorRun run = runTranslator(translator, " -i ", managedSystemName, product, "");
    if (!run.started) {
        trace().error("Failed to start two way translator using command [%s]", run.command);
        return {};
    }
    if (run.exitCode != 0) {
        trace().error("Received bad return code [%d] from two-way translator command [%s]",
                      run.exitCode, run.command);
        return {};
    }
    return run.stdOut;
}

}  // namespace

TASK_RC setConfig(TaskQueueElem& task) {
    Trace trace(traceUnit);
    const TASK_RC rc = setByTranslator(task);
    trace().detail("Return code is %d", rc);
    return trace.exit(rc);
}

TASK_RC getConfig(TaskQueueElem& task) {
    Trace trace(traceUnit);
    const TASK_RC rc = getByTranslator(task);
    trace().detail("Return code is %d", rc);
    return trace.exit(rc);
}

String getInstanceName(const String& product, const String& managedSystemName) {
    Trace trace(traceUnit);
    String instance;
    if (managedSystemName.length() != 0) {
        instance = product == "um" ? getUaInstanceName(managedSystemName)
                                   : instanceByTranslator(product, managedSystemName);
    }
    instance.trim();
    trace().detail("Returning instance [%s] for managed system name [%s]", instance,
                   managedSystemName);
    return instance;
}
