// The guards of the universal agent's import. On its way the plug-in stops and starts the agent and
// deletes what was imported before: what would make it fail later is found before it begins.

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>
#include <iterator>

#include "host/guard/guard.h"
#include "host/guard/machine/depot_file.h"
#include "host/guard/machine/import_options.h"
#include "host/guard/machine/listing.h"
#include "host/guard/refusal.h"
#include "host/guard/wording.h"
#include "host/home/parameter_copy.h"
#include "host/tables/plugin_facts.h"

namespace host {

void checkImportNames(CommandRequest& request, Machine& machine);
void checkImport(CommandRequest& request, Machine& machine);

namespace {

constexpr const char* kNames = "import-names";
constexpr const char* kImport = "import";

const std::string& metafileOf(const CommandRequest& request) {
    return request.value(plugin::kMetafileColumn);
}

/// The plug-in takes a run of commas for one.
std::vector<std::string> scriptsOf(const CommandRequest& request) {
    const std::string& list = request.value(plugin::kScriptsColumn);
    std::vector<std::string> names;
    for (std::size_t begin = 0; begin < list.size();) {
        const std::size_t end = std::min(list.find(',', begin), list.size());
        if (end > begin) names.push_back(list.substr(begin, end - begin));
        begin = end + 1;
    }
    return names;
}

// ---- The names ----------------------------------------------------------------------------------

/// Whether the name would not stay one word of a command line.
bool breaksCommandLines(const std::string& name) {
    return std::any_of(name.begin(), name.end(), [](char c) {
        return c == '"' || c == '\'' || c == '\\' || static_cast<unsigned char>(c) < ' ' ||
               c == 0x7F;
    });
}

bool climbs(const std::string& name) {
    return ("/" + name + "/").find("/../") != std::string::npos;
}

void checkName(const std::string& name, const Site& site) {
    const std::string shown = quoted(name, site.codePage);
    if (breaksCommandLines(name)) {
        throw Refusal(kNames,
                      "the name " + shown + " has a quote, a backslash or a control character",
                      "give the file another name", Refusal::Kind::Malformed);
    }
    if (climbs(name)) {
        throw Refusal(kNames, "the name " + shown + " leads out of the depot",
                      "name a file of the depot", Refusal::Kind::Malformed);
    }
    // Looked at here, because no task that waits could make it right.
    if (findInDepot(site.depot, name) == DepotFile::Outside) {
        throw Refusal(kNames, "a link in " + shown + " leads out of the depot",
                      "push the file itself into the depot");
    }
}

// ---- The files and the agent --------------------------------------------------------------------

void checkThere(const std::string& name, const char* what, const Site& site) {
    if (findInDepot(site.depot, name) == DepotFile::There) return;
    const std::vector<std::string> held = filesIn(site.depot);
    throw Refusal(kImport,
                  std::string("the depot holds no ") + what + " " + quoted(name, site.codePage) +
                      (held.empty() ? "" : "; it holds " + enumerated(held, site.codePage)),
                  "push it first");
}

/// Where the console looks for the metafile, only its last part has been copied.
void checkIsNotInAFolder(const std::string& metafile, const Site& site) {
    if (metafile.find('/') == std::string::npos) return;
    throw Refusal(kImport,
                  "the metafile " + quoted(metafile, site.codePage) +
                      " is in a folder of the depot, where the console does not find it",
                  "push it into the depot itself");
}

void checkConsole(const std::string& home) {
    const std::string console = home + "/bin/um_console";
    struct stat status {};
    if (::stat(console.c_str(), &status) == 0 && S_ISREG(status.st_mode) &&
        ::access(console.c_str(), X_OK) == 0) {
        return;
    }
    throw Refusal(kImport, "the home has no console that can be run, bin/um_console",
                  "install the universal agent");
}

/// The universal agent's start-up parameters; empty when there are none.
std::string startUpParameters(const std::string& home) {
    constexpr std::size_t kMost = std::size_t{1024} * 1024;
    const std::string file = startUpParametersOf(home);
    struct stat status {};
    if (::stat(file.c_str(), &status) != 0 || !S_ISREG(status.st_mode)) return "";
    std::ifstream in(file, std::ios::binary);
    std::string text(std::min(static_cast<std::size_t>(status.st_size), kMost), '\0');
    in.read(text.data(), static_cast<std::streamsize>(text.size()));
    text.resize(static_cast<std::size_t>(in.gcount()));
    return text;
}

void checkPortIsFree(const CommandRequest& request, const Site& site) {
    const std::vector<std::string> ports = portsIn(request.value(plugin::kContextColumn));
    if (ports.empty()) return;
    const std::string holder = holderOfPort(startUpParameters(site.home), portNumber(ports.back()),
                                            universalAgentInstance(request.target()));
    if (holder.empty()) return;
    throw Refusal(kImport,
                  "port " + ports.back() + " is the one of " + site.codePage.toUtf8(holder),
                  "name the port of the instance itself, or none");
}

}  // namespace

void checkImportNames(CommandRequest& request, Machine& machine) {
    if (!request.configuresUniversalAgent()) return;
    const Site& site = machine.site();
    if (metafileOf(request).empty()) {
        throw Refusal(kNames, "without a metafile the universal agent is not configured",
                      "name a metafile of the depot in UACONFIG (zavctl: ua-config --metafile)",
                      Refusal::Kind::Malformed);
    }
    checkName(metafileOf(request), site);
    for (const std::string& script : scriptsOf(request))
        checkName(script, site);
    for (const std::string& port : portsIn(request.value(plugin::kContextColumn))) {
        if (portNumber(port) != 0) continue;
        throw Refusal(kNames, "the port " + quoted(port, site.codePage) + " is no port",
                      "a port is a number from 1 to 65535", Refusal::Kind::Malformed);
    }
}

void checkImport(CommandRequest& request, Machine& machine) {
    if (!request.configuresUniversalAgent()) return;
    const Site& site = machine.site();
    checkIsNotInAFolder(metafileOf(request), site);
    checkThere(metafileOf(request), "metafile", site);
    for (const std::string& script : scriptsOf(request))
        checkThere(script, "script", site);
    checkConsole(site.home);
    checkPortIsFree(request, site);
}

}  // namespace host
