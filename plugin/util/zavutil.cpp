// The library's directories, and the host's name.
#include "util/zavutil.h"

#include <sys/utsname.h>
#include <unistd.h>

#include <cstdlib>
#include <mutex>
#include <string>

#include "base/zavtrace.h"
#include "platform/bss1.h"
#include "util/directory_tree.h"

namespace ZAV {

String& Util::_homeDir = *new String;
String& Util::_configDir = *new String;
String& Util::_agentDepotDir = *new String;

namespace {

RAS1_UNIT traceUnit{"zavutil"};

constexpr const char* kHomeVariable = "TOVRINHOME";
constexpr const char* kDepotVariable = "QVSDEPLOY_AGENTDEPOT";

// One lock for each cached directory, held while it is determined: one of several first callers
// does the work and the others get its result. The depot's lock is taken before the home's. All
// three are constant-initialised and never destroyed.
std::mutex homeLock;
std::mutex configLock;
std::mutex depotLock;

/// Returns a cached directory, or determines it when that has not succeeded yet.
bool getKept(std::mutex& lock, String& kept, bool (*init)(String&), String& dir) {
    const std::lock_guard<std::mutex> guard(lock);
    if (kept.length() == 0) {
        String found;
        if (init(found)) kept = found;
    }
    dir = kept;
    return dir.length() != 0;
}

const char* homeVariable() {
    const char* const value = BSS1_GetEnv(kHomeVariable, nullptr);
    return value != nullptr ? value : std::getenv(kHomeVariable);
}

bool existsTraced(const Trace& trace, bool exists, const String& path) {
    trace().detail(exists ? "Path [%s] exists" : "Path [%s] does not exist", path);
    return exists;
}

void endWithSlash(String& dir) {
    const unsigned length = dir.length();
    if (length == 0 || dir[length - 1] != '/') dir.append('/');
}

bool findHome(Trace& trace, String& dir) {
    const char* const value = homeVariable();
    if (value == nullptr) {
        trace().error("Environment variable %s, does not exist", kHomeVariable);
        return false;
    }
    dir.assign(value).trim();
    if (!Util::pathExists(dir)) {
        trace().error("Tovrin Home directory, %s, does not exist", dir);
        return false;
    }
    endWithSlash(dir);
    return true;
}

bool findConfig(Trace& trace, String& dir) {
    const char* const value = homeVariable();
    if (value == nullptr) {
        trace().error("Environment variable %s, does not exist", kHomeVariable);
        return false;
    }
    dir.assign(value).trim();
    endWithSlash(dir);
    dir.append("config").append('/');
    if (Util::pathExists(dir)) return true;
    trace().error("Tovrin Config directory, %s, does not exist", dir);
    return false;
}

bool chooseDepot(Trace& trace, String& dir) {
    const char* const value = BSS1_GetEnv(kDepotVariable, nullptr);
    if (value != nullptr) {
        dir.assign(value);
        return true;
    }
    trace().error("Staging dir environment variable \"%s\" is not set", kDepotVariable);
    if (Util::getTovrinHomeDir(dir)) return true;
    trace().error("TOVRINHOME not set. No idea what to use as a staging dir");
    return false;
}

bool provideDepot(Trace& trace, String& dir) {
    if (!chooseDepot(trace, dir)) return false;
    if (!Util::pathExists(dir)) {
        const int rc = Util::createDir(dir.c_str());
        if (rc != 0) {
            trace().error("Failed to create staging dir %s Return Code was %i", dir, rc);
            return false;
        }
        trace().detail("Successfully created staging dir %s", dir);
    }
    endWithSlash(dir);
    return true;
}

}  // namespace

bool pathExists(DirectoryTree& tree, const String& path) {
    Trace trace(traceUnit);
    return trace.exit(existsTraced(trace, tree.exists(path.c_str()), path));
}

bool Util::pathExists(const String& path) {
    Trace trace(traceUnit);
    return trace.exit(existsTraced(trace, ::access(path.c_str(), F_OK) == 0, path));
}

String Util::getHostName() {
    Trace trace(traceUnit);
    struct utsname names;
    if (::uname(&names) != 0) return String();
    const std::string node = names.nodename;
    return String(node.substr(0, node.find('.')).c_str());
}

bool Util::getTovrinHomeDir(String& dir) {
    Trace trace(traceUnit);
    return trace.exit(getKept(homeLock, _homeDir, initTovrinHomeDir, dir));
}

bool Util::getTovrinConfigDir(String& dir) {
    Trace trace(traceUnit);
    return trace.exit(getKept(configLock, _configDir, initTovrinConfigDir, dir));
}

bool Util::getAgentDepotDir(String& dir) {
    Trace trace(traceUnit);
    return trace.exit(getKept(depotLock, _agentDepotDir, initAgentDepotDir, dir));
}

bool Util::initTovrinHomeDir(String& dir) {
    Trace trace(traceUnit);
    const bool found = findHome(trace, dir);
    if (!found) dir.clear();
    return trace.exit(found);
}

bool Util::initTovrinConfigDir(String& dir) {
    Trace trace(traceUnit);
    const bool found = findConfig(trace, dir);
    if (!found) dir.clear();
    return trace.exit(found);
}

bool Util::initAgentDepotDir(String& dir) {
    Trace trace(traceUnit);
    const bool provided = provideDepot(trace, dir);
    if (!provided) dir.clear();
    trace().detail("Agent depot dir is \"%s\"", dir);
    return trace.exit(provided);
}

}  // namespace ZAV
