// Finds the central server's package depot.
#include <string>

#include "base/zavrbndl.h"
#include "base/zavtrace.h"
#include "util/zavprocs.h"
#include "util/zavutil.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavutil"};

constexpr int kNoDirectory = 1;
constexpr int kNoServerName = 2;

/// Reads what a child that has ended left in a stream. Does not wait for other processes that may
/// still hold the write end.
String readRest(ProcessInputStream& stream) {
    stream.setNonBlocking(true);
    std::string text;
    char chunk[1024];
    for (int got; (got = stream.read(chunk, sizeof chunk)) > 0;) {
        text.append(chunk, static_cast<std::size_t>(got));
    }
    return String(text.c_str());
}

/// The server's name is the part before the first "|" of the CELLNAME line in the home's
/// configuration.
bool findServerName(Trace& trace, const String& home, String& name) {
    const String command = String("/bin/sh -c \"grep CELLNAME ") + home +
                           "config/.ConfigData/kmsenv | grep -v default\"";
    trace().detail("Running command: %s", command);
    Process process(command);
    if (!process.start()) {
        trace().error("Unable to determine CMS name, process failed to start");
        return false;
    }
    int exitCode = 0;
    if (!process.wait(&exitCode) || exitCode != 0) {
        trace().error("Error running command, retCode = %d", exitCode);
        trace().error("Error message is: %s", readRest(*process.getStdErr()));
        trace().error("Unable to determine CMS name, error running command");
        return false;
    }
    const String output = readRest(*process.getStdOut());
    const unsigned bar = output.find(String("|"), 0);
    if (bar == String::NPOS) {
        trace().error("Unable to determine CMS name from kmsenv, stdout=[%s]", output);
        return false;
    }
    name = String(output, bar);
    trace().detail("CMS name found: %s", name);
    return true;
}

/// The value in the server's environment file, or else the depot beside that file.
String readDepotHome(Trace& trace, const String& tables) {
    const String environment = tables + "/KBBENV";
    const String usual = tables + "/depot";
    if (!Util::pathExists(environment)) {
        trace().error("Can't find %s, defaulting DEPOTHOME to %s", environment, usual);
        return usual;
    }
    try {
        const ResourceBundle bundle(environment, '*');
        const String* const value = bundle.getValue("DEPOTHOME");
        if (value != nullptr) return *value;
        trace().error("No DEPOTHOME in KBBENV, defaulting DEPOTHOME to %s", usual);
    } catch (const ResourceBundleException&) {
        trace().error("Caught ResourceBundleException, defaulting DEPOTHOME to %s", usual);
    }
    return usual;
}

/// Checks that the depot exists, or creates it. Returns 0 or kNoDirectory.
int provideDirectory(Trace& trace, const String& dir, bool create) {
    if (Util::pathExists(dir)) return 0;
    if (!create) {
        trace().error("Path [%s] does not exist", dir);
        return kNoDirectory;
    }
    trace().detail("Path [%s] does not exist, attempting to create", dir);
    if (Util::createDir(dir.c_str()) != 0) {
        trace().error("Could not create depot dir [%s]", dir);
        return kNoDirectory;
    }
    trace().detail("Depot directory [%s] created", dir);
    return 0;
}

int findDepotHome(Trace& trace, String& dir, bool addPackages, bool create) {
    String name;
    if (!findServerName(trace, dir, name)) return kNoServerName;
    dir = readDepotHome(trace, dir + "tables/" + name);
    if (addPackages) dir.append("/PACKAGES/");
    return provideDirectory(trace, dir, create);
}

}  // namespace

int Util::getDepotHome(String& dir, bool addPackages, bool create) {
    Trace trace(traceUnit);
    const int rc = findDepotHome(trace, dir, addPackages, create);
    trace().detail("Depot home is: %s", dir);
    return trace.exit(rc);
}

}  // namespace ZAV
