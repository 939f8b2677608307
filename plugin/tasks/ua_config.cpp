#include "tasks/ua_config.h"

#include <sys/stat.h>

#include "base/zavstr.h"
#include "base/zavtoken.h"
#include "base/zavtrace.h"
#include "tasks/failure.h"
#include "tasks/home.h"
#include "tasks/start_stop.h"
#include "tasks/task_state.h"
#include "tasks/ua_console.h"
#include "tasks/ua_files.h"
#include "tasks/ua_setup.h"
#include "tasks/whole_file.h"
#include "tasks/zavtqelm.h"
#include "util/zavutil.h"

using ZAV::String;
using ZAV::Trace;
using ZAV::Util;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

constexpr mode_t kScriptMode = 0755;

bool contains(const String& text, const String& part) {
    return text.find(part, 0) != String::NPOS;
}

// ---- Copying from the depot ---------------------------------------------------------------------

TASK_RC copyMetafile(UaSetup& setup) {
    Trace trace(traceUnit);
    const String source = depotDir + setup.metafile;
    if (Util::copyFile(source, setup.metaPath) == 0) return trace.exit(TASK_OK);
    return trace.exit(failTask(
        trace(), setup.task, TASK_METAFILE_NOT_COPIED, joinValues({source, setup.metaPath}),
        "%s Failed to copy MDL file %s to MDL directory %s", source, setup.metaPath));
}

void makeExecutable(const String& script) {
    Trace trace(traceUnit);
    trace().detail("Settings permissions on script file [%s] to [%d]", script, kScriptMode);
    if (::chmod(script.c_str(), kScriptMode) != 0) {
        trace().error("Failed to set permissions on file [%s] to [%d]", script, kScriptMode);
    }
}

TASK_RC copyScripts(UaSetup& setup) {
    Trace trace(traceUnit);
    for (StringTokenizer names(setup.scripts, ","); names.hasMoreTokens();) {
        const String source = depotDir + names.nextToken();
        if (Util::copyFile(source, setup.scriptsDir) != 0) {
            return trace.exit(failTask(trace(), setup.task, TASK_SCRIPT_NOT_COPIED,
                                       joinValues({source, setup.scriptsDir}),
                                       "%s Failed to copy Script file %s to scripts directory %s",
                                       source, setup.scriptsDir));
        }
        makeExecutable(setup.scriptsDir + "/" + getFilenameFromPath(source));
    }
    return trace.exit(TASK_OK);
}

/// Copies the scripts even when copying the metafile failed. If both fail, the failure of the
/// scripts is reported.
TASK_RC copyFiles(UaSetup& setup) {
    Trace trace(traceUnit);
    const TASK_RC metafile = copyMetafile(setup);
    const TASK_RC scripts = copyScripts(setup);
    return trace.exit(scripts != TASK_OK ? scripts : metafile);
}

// ---- The console --------------------------------------------------------------------------------

/// Has the console apply `verb` to the copied metafile.
ConsoleRun runConsole(const UaSetup& setup, const String& verb) {
    const UaConsole console{setup.workPath, setup.rbPath, setup.port};
    return console.run(verb, setup.metaPath + "/" + setup.metafile);
}

TASK_RC deleteMetafile(UaSetup& setup) {
    Trace trace(traceUnit);
    const ConsoleRun run = runConsole(setup, "DELETE");
    // The exit code does not matter: before its first import the console does not know the
    // metafile.
    if (run.started) return trace.exit(TASK_OK);
    return trace.exit(failTask(trace(), setup.task, TASK_DELETE_NOT_STARTED, run.command,
                               "%s Failed to start DELETE command [%s]", run.command));
}

TASK_RC importMetafile(UaSetup& setup) {
    Trace trace(traceUnit);
    const ConsoleRun run = runConsole(setup, "IMPORT");
    if (!run.started) {
        return trace.exit(failTask(trace(), setup.task, TASK_IMPORT_NOT_STARTED, run.command,
                                   "%s Failed to start IMPORT command [%s]", run.command));
    }
    if (run.exitCode != 0) {
        return trace.exit(failTask(trace(), setup.task, TASK_IMPORT_FAILED, setup.metafile,
                                   "%s Import of MDL file [%s] failed", setup.metafile));
    }
    trace().detail("Import of MDL file [%s] successfull", setup.metafile);
    return trace.exit(TASK_OK);
}

// ---- Adding the data provider -------------------------------------------------------------------

/// Reads the metafile's data provider type. Converts it and the list of start-up data providers to
/// upper case.
TASK_RC readProviderType(UaSetup& setup, String& type) {
    Trace trace(traceUnit);
    ConsoleRun run = runConsole(setup, "getdptype");
    if (!run.started) {
        return trace.exit(failTask(trace(), setup.task, TASK_GETDPTYPE_NOT_STARTED, run.command,
                                   "%s Failed to start GETDPTYPE command [%s]", run.command));
    }
    if (run.exitCode != 0) {
        return trace.exit(failTask(trace(), setup.task, TASK_NO_DPTYPE, setup.metafile,
                                   "%s Could not get DPTYPE from metafile [%s]", setup.metafile));
    }
    type = run.stdOut.trim().toUpper();
    setup.startupProviders.toUpper();
    trace().detail("DPTYPE for metafile [%s] is [%s]", setup.metafile, type);
    return trace.exit(TASK_OK);
}

/// Whether the list contains the data provider already, by its own name or as one of the four types
/// that the combined type includes.
bool alreadyStarted(const String& providers, const String& type) {
    Trace trace(traceUnit);
    constexpr const char* kCombined = "ASFS";
    String listed = type;
    const bool combinable = type == "APIS" || type == "SOCK" || type == "FILE" || type == "SCRP";
    if (combinable && contains(providers, kCombined)) {
        trace().detail("DPtype [%s] is part of dptype [ASFS]", type);
        listed = kCombined;
    }
    if (!contains(providers, listed)) return trace.exit(false);
    trace().detail("DPtype [%s] already in startup parms list [%s]", listed, providers);
    return trace.exit(true);
}

/// Stops the instance, changes its start-up parameters and starts it again. A failure in between
/// leaves it stopped.
TASK_RC restartWithProviders(UaSetup& setup) {
    Trace trace(traceUnit);
    const String& instance = setup.instance;
    if (stopAgent(setup.product, instance, nullptr) != TASK_OK) {
        return trace.exit(failTask(trace(), setup.task, TASK_INSTANCE_NOT_STOPPED, instance,
                                   "%s Failed to stop agent with instance (optional) [%s]",
                                   instance));
    }
    const String file = String(ZAV_TOVRINHOME) + "/config/.ConfigData/kumenv";
    if (changeUaStartupParms(file, setup.startupProviders, instance) == 0) {
        return trace.exit(failTask(
            trace(), setup.task, TASK_STARTUP_PARMS_NOT_CHANGED,
            joinValues({file, setup.startupProviders}),
            "%s Failed to update the ua config file [%s] to have new startup parms of [%s]", file,
            setup.startupProviders));
    }
    if (startAgent(setup.product, instance, nullptr) != TASK_OK) {
        return trace.exit(failTask(trace(), setup.task, TASK_INSTANCE_NOT_STARTED, instance,
                                   "%s Failed to start agent with instance (optional) [%s]",
                                   instance));
    }
    return trace.exit(TASK_OK);
}

TASK_RC addDataProvider(UaSetup& setup) {
    Trace trace(traceUnit);
    String type;
    const TASK_RC rc = readProviderType(setup, type);
    if (rc != TASK_OK || alreadyStarted(setup.startupProviders, type)) return trace.exit(rc);
    trace().detail("Adding [%s] to startup parms of [%s]", type, setup.startupProviders);
    removeChar(setup.startupProviders, '\'');
    setup.startupProviders.append("," + type);
    return trace.exit(restartWithProviders(setup));
}

}  // namespace

TASK_RC setUaconfig(TaskQueueElem& task) {
    Trace trace(traceUnit);
    UaSetup setup(task);
    if (setup.metafile.length() == 0 && setup.scripts.length() == 0) {
        trace().error("UA SetConfig called but no MDL or Script files specified");
        return trace.exit(TASK_OK);
    }
    TASK_RC rc = prepareUaSetup(setup);
    if (rc != TASK_OK) return trace.exit(rc);
    // Without a metafile nothing is done, and the scripts are not copied either.
    if (setup.metafile.length() != 0) {
        rc = copyFiles(setup);
        if (rc == TASK_OK && setup.restart) {
            rc = addDataProvider(setup);
            if (rc != TASK_OK) return trace.exit(rc);
        }
        if (rc == TASK_OK) rc = deleteMetafile(setup);
        if (rc == TASK_OK) rc = importMetafile(setup);
    }
    trace().detail("Return code is %d", rc);
    return trace.exit(rc);
}
