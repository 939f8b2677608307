#include "tasks/ua_files.h"

#include <vector>

#include "base/zavtoken.h"
#include "base/zavtrace.h"
#include "tasks/home.h"
#include "tasks/whole_file.h"
#include "util/zavutil.h"

using ZAV::String;
using ZAV::StrStrMap;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

/// Splits "NAME=value" without trimming the parts; false when one of them is empty.
bool splitPair(const String& line, String& key, String& value) {
    const std::uint32_t separator = line.find("=", 0);
    if (separator == String::NPOS || separator == 0 || separator + 1 == line.length()) return false;
    key = line.substr(0, separator);
    value = line.substr(separator + 1);
    return true;
}

/// Replaces every line that contains `marker` as a whole, and drops empty lines. Collects the units
/// in a vector, because a String would copy its text for each line.
String replaceMarkedLines(const String& text, const String& marker, const String& replacement) {
    std::vector<unsigned short> units;
    units.reserve(text.length() + 1);
    for (StringTokenizer lines(text, "\n"); lines.hasMoreTokens();) {
        const String line = lines.nextToken();
        const String& kept = line.find(marker, 0) == String::NPOS ? line : replacement;
        units.insert(units.end(), kept.getData(), kept.getData() + kept.length());
        units.push_back('\n');
    }
    String replaced;
    replaced.assign(units.data(), static_cast<std::uint32_t>(units.size()));
    return replaced;
}

}  // namespace

String getUaConfigFileName(const String& instance) {
    Trace trace(traceUnit);
    String path = String(ZAV_TOVRINHOME) + "/config/um";
    if (instance.length() != 0) path.append("_" + instance);
    path.append(".config");
    trace().detail("UA Configuration file is \"%s\", instance (optional) is \"%s\"", path,
                   instance);
    return path;
}

String getUaInstanceName(const String& managedSystemName) {
    Trace trace(traceUnit);
    String instance;
    const std::uint32_t suffix = managedSystemName.find(":UA", 0);
    if (suffix != String::NPOS && suffix > 0) {
        const String name = managedSystemName.substr(0, suffix);
        const std::uint32_t host = name.find(":", 0);
        if (host != String::NPOS && host > 0) instance = name.substr(0, host);
    }
    trace().detail("Returning instance <%s> for managed system name <%s>", instance,
                   managedSystemName);
    return instance;
}

StrStrMap populateHashMapFromFile(const String& path, char commentChar) {
    Trace trace(traceUnit);
    const unsigned short comment = static_cast<unsigned char>(commentChar);
    StrStrMap pairs;
    for (StringTokenizer lines(readFile(path), "\n"); lines.hasMoreTokens();) {
        String line = lines.nextToken();
        line.trim();
        String key;
        String value;
        if (line.length() == 0 || line[0] == comment || !splitPair(line, key, value)) continue;
        pairs.put(key, value);
    }
    return pairs;
}

int changeUaStartupParms(String configFile, String parms, String instance) {
    Trace trace(traceUnit);
    trace().detail("Writing startup parms [%s] to config file [%s] instance [%s]", parms,
                   configFile, instance);
    const String text = readFile(configFile);
    if (text.length() == 0) {
        trace().error("Contents of config file [%s] was empty", configFile);
        return trace.exit(0);
    }
    const String marker = instance + "|DATAPROVIDER|";
    const String copy = configFile + ".copy";
    if (writeFile(copy, replaceMarkedLines(text, marker, marker + parms + "|")) == 0) {
        trace().error("Failed to write to file %s", configFile);
        return trace.exit(0);
    }
    // From here until the copy is moved back, the file does not exist under its own name.
    String directory;
    if (deleteFile(configFile) == 0 || getDirectoryFromPath(configFile, directory) == 0 ||
        ZAV::Util::copyFile(copy, directory, getFilenameFromPath(configFile)) != 0) {
        return trace.exit(0);
    }
    deleteFile(copy);
    return trace.exit(1);
}
