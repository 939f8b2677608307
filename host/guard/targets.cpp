// The guard of targets that nobody knows. The plug-in takes a managed system name that it cannot
// resolve for the default instance, so that a typing slip would stop the wrong agent.

#include <strings.h>

#include "host/guard/guard.h"
#include "host/guard/machine/listing.h"
#include "host/guard/machine/system_name.h"
#include "host/guard/refusal.h"
#include "host/guard/wording.h"
#include "host/tables/plugin_facts.h"

namespace host {

void checkTarget(CommandRequest& request, Machine& machine);

namespace {

bool isResolved(const CommandRequest& request) {
    const std::string& command = request.command();
    if (request.targetIsInstance() || request.product().empty()) return false;
    // The plug-in itself refuses to remove an instance of the universal agent.
    if (command == plugin::kRemoveInstance) return request.product() != plugin::kUniversalAgent;
    return command == plugin::kStart || command == plugin::kStop || command == plugin::kRestart;
}

/// The host in "INSTANCE:HOST:CODE" or "HOST:CODE"; a name without a colon is one itself.
std::string hostIn(const std::string& name) {
    const std::size_t last = name.rfind(':');
    if (last == std::string::npos) return name;
    const std::size_t before = last == 0 ? std::string::npos : name.rfind(':', last - 1);
    const std::size_t begin = before == std::string::npos ? 0 : before + 1;
    return name.substr(begin, last - begin);
}

bool equalIgnoringCase(const std::string& a, const std::string& b) {
    return !a.empty() && ::strcasecmp(a.c_str(), b.c_str()) == 0;
}

/// Whether it is the default instance's own name: "HOST:CODE" of this machine or of the origin
/// node. A name with another code, or with an instance before the host, means something else.
bool namesDefaultInstance(const std::string& product, const std::string& target) {
    const std::size_t colon = target.find(':');
    if (colon == std::string::npos || colon != target.rfind(':')) return false;
    const std::string host = target.substr(0, colon);
    return equalIgnoringCase(target.substr(colon + 1), systemCodeOf(product)) &&
           (equalIgnoringCase(host, shortHostName()) ||
            equalIgnoringCase(host, hostIn(oxa::originNode())));
}

/// The default instance and those that have a configuration file.
std::vector<std::string> knownNames(const Site& site, const std::string& product) {
    std::vector<std::string> names = {systemName(product, "")};
    const std::string prefix = product + "_";
    for (const std::string& file : filesIn(site.home + "/config")) {
        const std::size_t dot = file.rfind('.');
        if (file.compare(0, prefix.size(), prefix) != 0 || dot == std::string::npos) continue;
        const std::string extension = file.substr(dot);
        if (extension != ".cfg" && extension != ".config") continue;
        if (dot <= prefix.size()) continue;
        names.push_back(systemName(product, file.substr(prefix.size(), dot - prefix.size())));
    }
    return names;
}

}  // namespace

void checkTarget(CommandRequest& request, Machine& machine) {
    const std::string& target = request.target();
    if (target.empty() || !isResolved(request)) return;
    const Resolution resolved = machine.resolve(request.product(), target);
    if (!resolved.instance.empty() || namesDefaultInstance(request.product(), target)) return;
    const std::vector<std::string> known = knownNames(machine.site(), request.product());
    throw Refusal("target",
                  quoted(target, machine.site().codePage) + " names no instance of " +
                      request.product() +
                      " here; the default instance would be taken in its place" +
                      (resolved.complaint.empty()
                           ? ""
                           : " (" + machine.site().codePage.toUtf8(resolved.complaint) + ")"),
                  "known " + std::string(known.size() == 1 ? "is " : "are ") +
                      enumerated(known, machine.site().codePage));
}

}  // namespace host
