#include "tasks/ua_setup.h"

#include "base/zavhmap.h"
#include "base/zavtoken.h"
#include "base/zavtrace.h"
#include "tasks/failure.h"
#include "tasks/product_arch.h"
#include "tasks/ua_files.h"
#include "tasks/whole_file.h"
#include "util/zavutil.h"

using ZAV::String;
using ZAV::StrStrMap;
using ZAV::Trace;
using ZAV::Util;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

bool contains(const String& text, const String& part) {
    return text.find(part, 0) != String::NPOS;
}

/// The part of an option after its first "="; empty when there is none.
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

/// Finds the instance's file by the given name, or else by the name in lower case, which is then
/// used as the instance's name from here on.
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

/// Reads a value of the configuration file and removes its quotes.
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
        // "[%]" is not a conversion and is written literally; the key's name is no argument.
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

}  // namespace

TASK_RC prepareUaSetup(UaSetup& setup) {
    Trace trace(traceUnit);
    setup.instance = getUaInstanceName(setup.task.getTargetmsn());
    readOptions(setup);
    TASK_RC rc = findConfigFile(setup);
    if (rc == TASK_OK) rc = readConfigFile(setup);
    if (rc == TASK_OK) rc = findScriptsDirectory(setup);
    if (rc == TASK_OK) rc = checkInstalled(setup);
    return trace.exit(rc);
}
