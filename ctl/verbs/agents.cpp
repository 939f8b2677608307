#include "ctl/verbs/agents.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <utility>

#include "ctl/client/failure.h"
#include "ctl/client/instances.h"
#include "ctl/client/row.h"
#include "ctl/show/instance_table.h"
#include "ctl/show/table.h"
#include "ctl/show/warnings.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"
#include "ctl/verbs/watched.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kOnlyProduct =
    textOption("--product", "Only this product code").completedBy(Completion::Product);
constexpr Argument kPlatform = textOption("--platform", "Only this platform");
constexpr Argument kArguments[] = {kOnlyProduct, kPlatform, kWatch};

std::string agentsText(const json& rows) {
    if (rows.empty()) return "No products are listed.\n";
    return tableText(rows, {{"PRODUCT", "PRODUCT"},
                            {"VERSION", "VERSION"},
                            {"RELEASE", "RELEASE"},
                            {"PLATFORM", "PLATFORM"},
                            {"HOSTTYPE", "SYSTEM"},
                            {"HOSTPC", "ARCHITECTURE"},
                            {"PRODDESC", "DESCRIPTION"}});
}

ExitStatus run(const Invocation& invocation) {
    const auto look = [&invocation] {
        Agents agents = askAgents(invocation);
        Page page = showAgents(agents, invocation.format);
        return Look{{std::move(agents.inventory.rows), std::move(agents.instances)},
                    std::move(page)};
    };
    return invocation.given.flag(kWatch) ? watch(invocation, look) : print(look().page);
}

}  // namespace

constexpr Verb kAgentsVerb = {
    "agents",   "List the installed products, and which agents run",
    kArguments, {"zavctl agents", "zavctl agents --product ux --watch"},
    run,
};

Agents askAgents(const Invocation& invocation) {
    std::vector<Condition> where;
    const std::string& product = invocation.given.text(kOnlyProduct);
    if (!product.empty()) where.push_back({"PRODUCT", "=", product});
    const std::string& platform = invocation.given.text(kPlatform);
    if (!platform.empty()) where.push_back({"PLATFORM", "=", platform});
    const HostClient client(invocation.host.socket);
    const Deadline deadline = invocation.deadline();
    Agents agents{client.query({"KINAGT", where}, deadline)};
    if (!platform.empty()) return agents;  // instances have none of their own
    try {
        agents.instances = listInstances(client, deadline);
    } catch (const Failure& failure) {
        agents.doubt = failure.what();
    }
    if (!product.empty() && agents.instances.is_array()) {
        json& all = agents.instances;
        all.erase(std::remove_if(
                      all.begin(), all.end(),
                      [&](const json& instance) { return textOf(instance, "product") != product; }),
                  all.end());
    }
    return agents;
}

Page showAgents(const Agents& agents, Format format) {
    const QueryAnswer& inventory = agents.inventory;
    const bool isTaken = inventory.warnings.empty();
    const ExitStatus status = isTaken ? kSuccess : kHostReportedFailure;
    const std::string doubt =
        agents.doubt.empty() ? ""
                             : complaint("note: which agents run is not known: " + agents.doubt);
    if (format == Format::Json) {
        json document = answerDocument(inventory);
        if (agents.instances.is_array()) document["instances"] = agents.instances;
        Page page = jsonPage(document, status);
        page.err += doubt;
        return page;
    }
    Page page{agentsText(inventory.rows), warningsText(inventory.warnings), status};
    // Nothing listed means nothing installed only where the inventory was taken.
    if (!isTaken && inventory.rows.empty()) page.out.clear();
    const std::string instances = instanceTable(agents.instances);
    if (!instances.empty()) page.out += "\n" + instances;
    if (!isTaken) page.err += complaint("what is installed could not be found out in full");
    page.err += doubt;
    return page;
}

}  // namespace ctl
