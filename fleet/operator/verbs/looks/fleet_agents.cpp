#include "fleet/operator/verbs/looks/fleet_agents.h"

#include <algorithm>
#include <chrono>
#include <nlohmann/json.hpp>

#include "ctl/show/printable.h"
#include "ctl/show/table.h"
#include "ctl/show/time_text.h"
#include "ctl/verbs/invocation.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/orders/chosen_hosts.h"
#include "fleet/operator/verbs/fleet_arguments.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "fleet/operator/verbs/operator_side.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr ctl::Argument kFleetProduct = ctl::textOption("--product", "Only this product code");
constexpr ctl::Argument kFleetAgentsArguments[] = {kFleetProduct};

/// The member of an object that is of this kind; an empty one otherwise.
const json& objectIn(const json& object, const char* member) {
    static const json none = json::object();
    const auto found = object.is_object() ? object.find(member) : object.end();
    return found != object.end() && found->is_object() ? *found : none;
}

json listIn(const json& object, const char* member) {
    const auto found = object.find(member);
    return found != object.end() && found->is_array() ? *found : json::array();
}

/// A host's inventory; empty if it has never told one.
const json& inventoryOf(const json& host) {
    return objectIn(objectIn(host, "facts"), "inventory");
}

std::string ageText(const json& inventory) {
    constexpr std::uint64_t kLongest = 1'000'000'000'000;
    const std::uint64_t age = std::min(memberNumber(inventory, "age"), kLongest);
    return ctl::spanText(std::chrono::seconds(static_cast<std::int64_t>(age)));
}

/// Without those of other products.
json onlyProduct(json hosts, const std::string& product) {
    if (product.empty()) return hosts;
    const auto filter = [&product](json& inventory, const char* list, const char* member) {
        const auto found = inventory.find(list);
        if (found == inventory.end() || !found->is_array()) return;
        found->erase(
            std::remove_if(found->begin(), found->end(),
                           [&](const json& entry) { return memberText(entry, member) != product; }),
            found->end());
    };
    for (json& host : hosts) {
        if (inventoryOf(host).empty()) continue;
        json& inventory = host["facts"]["inventory"];
        filter(inventory, "products", "PRODUCT");
        filter(inventory, "instances", "product");
    }
    return hosts;
}

std::string productTable(const json& hosts) {
    json rows = json::array();
    for (const json& host : hosts) {
        const json& inventory = inventoryOf(host);
        if (inventory.empty()) continue;
        const auto row = [&](const json& product) {
            return json{{"host", memberText(host, "name")},
                        {"product", memberText(product, "PRODUCT")},
                        {"version", memberText(product, "VERSION")},
                        {"release", memberText(product, "RELEASE")},
                        {"architecture", memberText(product, "HOSTPC")},
                        {"age", ageText(inventory)}};
        };
        const json products = listIn(inventory, "products");
        for (const json& product : products)
            rows.push_back(row(product));
        // That nothing is installed is known, too.
        if (products.empty()) rows.push_back(row({{"PRODUCT", "-"}}));
    }
    if (rows.empty()) return {};
    return ctl::tableText(rows, {{"host", "HOST"},
                                 {"product", "PRODUCT"},
                                 {"version", "VERSION"},
                                 {"release", "RELEASE"},
                                 {"architecture", "ARCHITECTURE"},
                                 {"age", "AGE"}});
}

std::string fleetInstances(const json& hosts) {
    json rows = json::array();
    for (const json& host : hosts) {
        for (const json& instance : listIn(inventoryOf(host), "instances")) {
            const std::string state = memberText(instance, "state");
            if (state == "stopped") continue;
            rows.push_back({{"host", memberText(host, "name")},
                            {"target", memberText(instance, "target")},
                            {"state", state == "missing" ? "should run, does not" : state},
                            {"user", memberText(instance, "user")}});
        }
    }
    if (rows.empty()) return {};
    return "\n" +
           ctl::tableText(
               rows,
               {{"host", "HOST"}, {"target", "INSTANCE"}, {"state", "STATE"}, {"user", "USER"}});
}

/// What is wrong with the inventories that there are.
std::string inventoryDoubts(const json& hosts) {
    std::string text;
    for (const json& host : hosts) {
        const json& inventory = inventoryOf(host);
        const std::string name = memberText(host, "name");
        for (const json& warning : listIn(inventory, "warnings")) {
            if (!warning.is_string()) continue;
            text += ctl::complaint(name + ": " + warning.get<std::string>());
        }
        if (const std::uint64_t leftOut = memberNumber(inventory, "leftOut")) {
            text += ctl::complaint(name + ": the inventory is too long to be told; " +
                                   std::to_string(leftOut) + " entries are left out");
        }
    }
    return text;
}

ctl::ExitStatus runFleetAgents(const ctl::Invocation& invocation) {
    OperatorSide side(invocation);
    const json hosts = inventoryDocuments(side.centre, invocation.given.text(kOn));
    return ctl::print(
        showFleetAgents(hosts, invocation.given.text(kFleetProduct), invocation.format));
}

}  // namespace

constexpr ctl::Verb kFleetAgentsVerb = {
    "agents",
    "List what is installed on many hosts, as they have told",
    kFleetAgentsArguments,
    {"zavctl --fleet https://centre.example agents --on env=test",
     "zavctl --fleet https://centre.example --json agents --on '*' --product ux"},
    runFleetAgents,
};

ctl::Page showFleetAgents(const json& hosts, const std::string& product, ctl::Format format) {
    const json shown = onlyProduct(hosts, product);
    json silent = json::array();
    std::string names;
    for (const json& host : shown) {
        if (!inventoryOf(host).empty()) continue;
        silent.push_back(memberText(host, "name"));
        names += (names.empty() ? "" : ", ") + memberText(host, "name");
    }
    const std::string doubts = inventoryDoubts(shown);
    const ctl::ExitStatus status =
        silent.empty() && doubts.empty() ? ctl::kSuccess : ctl::kHostReportedFailure;
    if (format == ctl::Format::Json) {
        return ctl::jsonPage({{"hosts", shown}, {"unknown", silent}}, status);
    }
    ctl::Page page{productTable(shown) + fleetInstances(shown), doubts, status};
    if (!silent.empty()) page.err += ctl::complaint("no inventory was ever told by: " + names);
    return page;
}

}  // namespace fleet
