#include "tasks/ua_config.h"

#include <sys/stat.h>

#include <string>
#include <vector>

#include "base/zavhmap.h"
#include "base/zavstr.h"
#include "base/zavtoken.h"
#include "base/zavtrace.h"
#include "tasks/failure.h"
#include "tasks/home.h"
#include "tasks/product_arch.h"
#include "tasks/start_stop.h"
#include "tasks/ua_files.h"
#include "tasks/whole_file.h"
#include "tasks/zavtasks.h"
#include "tasks/zavtqelm.h"
#include "util/zavutil.h"

using ZAV::String;
using ZAV::StrStrMap;
using ZAV::Trace;
using ZAV::Util;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

constexpr mode_t kScriptMode = 0755;

/// One request and what has been worked out for it so far, in the order in which it is.
struct UaSetup {
    explicit UaSetup(TaskQueueElem& request)
        : task(request),
          product(request.getProduct()),
          metafile(request.getUaconfig()),
          scripts(request.getUascript()) {}

    TaskQueueElem& task;
    const String product;
    const String metafile;  // its name in the depot
    const String scripts;   // names in the depot with "," between them
    String instance;        // empty for the default instance
    String port;            // of the console; empty when none was given
    bool restart = false;
    String configFile;
    String metaPath;
    String workPath;
    String rbPath;
    String startupProviders;  // data provider types with "," between them
    String scriptsDir;
};

bool contains(const String& text, const String& part) {
    return text.find(part, 0) != String::NPOS;
}

// ---- What the request and the configuration file say --------------------------------------------

/// What follows the first "=" of an option; empty when nothing does.
String optionValue(const String& option) {
    const std::uint32_t separator = option.find("=", 0);
    if (separator == String::NPOS || separator + 1 == option.length()) return {};
    return option.substr(separator + 1);
}

void readOptions(UaSetup& setup) {
    Trace trace(traceUnit);
    String context = setup.task.getContext();
    context.trim().toUpper();
    for (StringTokenizer options(context, ","); options.hasMoreTokens();) {
        const String option = options.nextToken();
        const String value = optionValue(option);
        if (value.length() == 0) continue;
        if (contains(option, "PORT=")) setup.port = value;
        if (contains(option, "RESTART=") && value == "Y") setup.restart = true;
    }
    trace().detail("Context [%s] port (optional) [%s] restart (1=true) [%d]", context, setup.port,
                   setup.restart);
}

/// The file of the instance as it was named or else of its name in lower case, which is then the
/// instance's name for all that follows.
TASK_RC findConfigFile(UaSetup& setup) {
    Trace trace(traceUnit);
    setup.configFile = getUaConfigFileName(setup.instance);
    if (Util::pathExists(setup.configFile)) return trace.exit(TASK_OK);
    setup.instance.toLower();
    setup.configFile = getUaConfigFileName(setup.instance);
    if (Util::pathExists(setup.configFile)) return trace.exit(TASK_OK);
    return trace.exit(failTask(
        trace(), setup.task, TASK_NO_CONFIG_FILE, joinValues({setup.configFile, setup.instance}),
        "%s Configuration file [%s] for instance (optional) [%s] does not exist", setup.configFile,
        setup.instance));
}

/// A value of the configuration file, without its quotes.
bool readValue(const StrStrMap& pairs, const char* key, String& value) {
    if (!pairs.get(key, value)) return false;
    removeChar(value, '\'');
    return true;
}

TASK_RC readConfigFile(UaSetup& setup) {
    Trace trace(traceUnit);
    const StrStrMap pairs = populateHashMapFromFile(setup.configFile, '*');
    struct Required {
        const char* key;
        String& value;
        TASK_RC missing;
    };
    const Required required[] = {{"KUMP_META_PATH", setup.metaPath, TASK_NO_META_PATH},
                                 {"KUM_WORK_PATH", setup.workPath, TASK_NO_WORK_PATH},
                                 {"KUMP_RB_PATH", setup.rbPath, TASK_NO_RB_PATH}};
    for (const Required& entry : required) {
        if (readValue(pairs, entry.key, entry.value)) continue;
        return trace.exit(failTask(
            trace(), setup.task, entry.missing, joinValues({entry.key, setup.configFile}),
            "%s No value found for [%s] in config file [%s]", entry.key, setup.configFile));
    }
    constexpr const char* kStartupProviders = "KUMA_STARTUP_DP";
    if (!readValue(pairs, kStartupProviders, setup.startupProviders)) {
        trace().error("No value found for %s", kStartupProviders);
    }
    return trace.exit(TASK_OK);
}

TASK_RC findScriptsDirectory(UaSetup& setup) {
    Trace trace(traceUnit);
    const std::uint32_t separator = setup.workPath.rfind('/');
    if (separator == String::NPOS) {
        // "[%]" is no conversion and is written as it stands: the key's name is not an argument.
        return trace.exit(failTask(
            trace(), setup.task, TASK_BAD_WORK_PATH,
            joinValues({"KUM_WORK_PATH", setup.workPath, setup.configFile}),
            "%s Work directory [%s] from tag [%] in config file [%s] cannot be parsed, no dir "
            "separator",
            setup.workPath, setup.configFile));
    }
    setup.scriptsDir = setup.workPath.substr(0, separator) + "/scripts";
    return trace.exit(TASK_OK);
}

TASK_RC checkInstalled(UaSetup& setup) {
    Trace trace(traceUnit);
    const String directory = getProductArchDir(getProductArch(setup.product), setup.product);
    if (directory.length() == 0) {
        return trace.exit(failTask(trace(), setup.task, TASK_NOT_INSTALLED, setup.product,
                                   "%s Supplied product code [%s] is not installed",
                                   setup.product));
    }
    trace().detail("UA Base Dir is [%s]", directory + "/");
    trace().detail("UA Bin Dir is [%s]", directory + "/bin/");
    trace().detail("UA Work Dir is [%s]", setup.workPath);
    trace().detail("UA Scripts Dir is [%s]", setup.scriptsDir);
    trace().detail("UA RB Dir is [%s]", setup.rbPath);
    return trace.exit(TASK_OK);
}

/// Works everything out without changing anything.
TASK_RC prepare(UaSetup& setup) {
    Trace trace(traceUnit);
    setup.instance = getUaInstanceName(setup.task.getTargetmsn());
    readOptions(setup);
    TASK_RC rc = findConfigFile(setup);
    if (rc == TASK_OK) rc = readConfigFile(setup);
    if (rc == TASK_OK) rc = findScriptsDirectory(setup);
    if (rc == TASK_OK) rc = checkInstalled(setup);
    return trace.exit(rc);
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

/// The scripts are copied even when the metafile could not be; a script's failure is then the one
/// that is reported.
TASK_RC copyFiles(UaSetup& setup) {
    Trace trace(traceUnit);
    const TASK_RC metafile = copyMetafile(setup);
    const TASK_RC scripts = copyScripts(setup);
    return trace.exit(scripts != TASK_OK ? scripts : metafile);
}

// ---- The console --------------------------------------------------------------------------------

/// The settings for one run of the console, as a list that ends in a null pointer.
class ConsoleEnvironment {
public:
    explicit ConsoleEnvironment(const UaSetup& setup) {
        add("KUM_PRODSPEC_PATH=" + setup.workPath + "/");
        add("KUMP_RB_PATH=" + setup.rbPath);
        add("KUMP_DPCONSOLE_NOCONFIRM=Y");
        if (setup.port.length() != 0) add("KUMP_DPCONSOLE_PORT=" + setup.port);
        for (std::string& setting : settings_)
            pointers_.push_back(setting.data());
        pointers_.push_back(nullptr);
    }
    ConsoleEnvironment(const ConsoleEnvironment&) = delete;
    ConsoleEnvironment& operator=(const ConsoleEnvironment&) = delete;

    char** list() { return pointers_.data(); }

private:
    void add(const String& setting) {
        Trace trace(traceUnit);
        settings_.emplace_back(static_cast<const char*>(setting.c_str()));
        trace().detail("Environment variable %d - %s", settings_.size(), setting);
    }

    std::vector<std::string> settings_;
    std::vector<char*> pointers_;
};

struct ConsoleRun {
    String command;
    bool started = false;
    int exitCode = 0;
    String stdOut;
};

/// Has the console do `verb` with the metafile that was copied.
ConsoleRun runConsole(const UaSetup& setup, const String& verb) {
    const String home = ZAV_TOVRINHOME;
    ConsoleRun run;
    run.command = home + "/bin/um_console -h " + home + " -c \"" + verb + " " + setup.metaPath +
                  "/" + setup.metafile + "\"";
    ConsoleEnvironment environment(setup);
    String stdErr;
    run.started = Util::runCommandEnv(run.command, environment.list(), run.exitCode, run.stdOut,
                                      stdErr, "", false);
    return run;
}

TASK_RC deleteMetafile(UaSetup& setup) {
    Trace trace(traceUnit);
    const ConsoleRun run = runConsole(setup, "DELETE");
    // What the console says does not matter: a metafile imported for the first time is not there.
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

/// The data provider type of the metafile, in upper case as the list of start-up data providers
/// then is too.
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

/// Whether the list starts the data provider already, by its own name or as one of the four that
/// the combined type stands for.
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

/// Stops the instance, changes its start-up parameters and starts it. A failure part-way leaves it
/// stopped.
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
    TASK_RC rc = prepare(setup);
    if (rc != TASK_OK) return trace.exit(rc);
    // Without a metafile nothing is done, not even with the scripts.
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
