// The guards of products that are not there: commands for a product that is not installed, and
// installs from a folder that the depot does not have.

#include <sys/stat.h>

#include <algorithm>
#include <set>

#include "host/guard/guard.h"
#include "host/guard/machine/listing.h"
#include "host/guard/refusal.h"
#include "host/guard/wording.h"
#include "host/tables/plugin_facts.h"

namespace host {

void checkProduct(CommandRequest& request, Machine& machine);
void checkDeployFolder(CommandRequest& request, Machine& machine);

namespace {

/// Without the shared component, which is no agent.
std::vector<std::string> agentsIn(const Inventory& inventory) {
    std::set<std::string> agents;
    for (const InstalledProduct& entry : inventory.products) {
        if (entry.code != plugin::kSharedComponent) agents.insert(entry.code);
    }
    return {agents.begin(), agents.end()};
}

std::string whatIsThere(const std::vector<std::string>& agents, const CodePage& codePage) {
    if (agents.empty()) return "none is installed";
    return (agents.size() == 1 ? "installed is " : "installed are ") + enumerated(agents, codePage);
}

std::string reasonAgainst(const std::string& product, const Inventory& inventory,
                          const CodePage& codePage) {
    if (!inventory.result.succeeded()) {
        return "whether there is a product " + quoted(product, codePage) +
               " here is not known: bin/cinfo " + endInWords(inventory.result);
    }
    return "there is no product " + quoted(product, codePage) + " here; " +
           whatIsThere(agentsIn(inventory), codePage);
}

bool isFolder(const std::string& path) {
    struct stat status {};
    return ::stat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode);
}

/// What |DEPLOYDIR| stands for, relative to the depot.
std::string deployFolder(const CommandRequest& request) {
    const std::string& product = request.product();
    if (product == plugin::kCommonInstaller) return product;
    return product + "/" + request.value(plugin::kVersionColumn);
}

}  // namespace

void checkProduct(CommandRequest& request, Machine& machine) {
    const std::string& product = request.product();
    if (request.force() || product.empty() || !plugin::needsProduct(request.command())) return;
    const Inventory& inventory = machine.inventory();
    if (inventory.has(product)) return;
    throw Refusal("product", reasonAgainst(product, inventory, machine.site().codePage),
                  "\"force\": true (zavctl: --force) sends it all the same");
}

void checkDeployFolder(CommandRequest& request, Machine& machine) {
    if (request.command() != plugin::kInstall) return;
    const std::string& command = request.value(plugin::kContextColumn);
    if (command.find(plugin::kDeployFolderToken) == std::string::npos) return;
    const std::string folder = deployFolder(request);
    const std::string& depot = machine.site().depot;
    if (isFolder(depot + "/" + folder)) return;
    const std::vector<std::string> held = foldersIn(depot, 2);
    throw Refusal("deploy-folder",
                  "the depot has no folder " + folder + "; it has " +
                      (held.empty() ? "none" : enumerated(held, machine.site().codePage)),
                  "push the package to " + folder + " first, or name the version that is there");
}

}  // namespace host
