#include "fleet/server/keys/directory/fleet_facts.h"

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/keys/files/keys_error.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::size_t kMostFacts = 100;

FleetFacts factsIn(const json& document) {
    FleetFacts facts;
    facts.fleet = textIn(document, "fleet");
    facts.root = textIn(document, "root");
    facts.busOperator = textIn(document, "bus_operator");
    facts.accounts.control = textIn(document, "control_account");
    facts.accounts.hosts = textIn(document, "hosts_account");
    facts.accounts.hostSigner = textIn(document, "host_signer");
    facts.accounts.system = textIn(document, "system_account");
    facts.url = textIn(document, "url");
    facts.busUrls = textsIn(document, "bus", kMostFacts);
    facts.names = textsIn(document, "names", kMostFacts);
    facts.busDirectory = textIn(document, "bus_directory");
    for (const std::string& centre : textsIn(document, "centres", kMostFacts))
        facts.centres.push_back(bytesOfBase64(centre));
    return facts;
}

}  // namespace

std::string textOfFacts(const FleetFacts& facts) {
    json centres = json::array();
    for (const std::string& centre : facts.centres)
        centres.push_back(base64Of(centre));
    const json document = {{"fleet", facts.fleet},
                           {"root", facts.root},
                           {"bus_operator", facts.busOperator},
                           {"control_account", facts.accounts.control},
                           {"hosts_account", facts.accounts.hosts},
                           {"host_signer", facts.accounts.hostSigner},
                           {"system_account", facts.accounts.system},
                           {"url", facts.url},
                           {"bus", facts.busUrls},
                           {"names", facts.names},
                           {"bus_directory", facts.busDirectory},
                           {"centres", centres}};
    return document.dump(2, ' ', false, json::error_handler_t::replace) + "\n";
}

FleetFacts readFacts(std::string_view text) {
    try {
        return factsIn(readDocument(text));
    } catch (const MessageError& error) {
        throw KeysError(std::string("what is known of the fleet cannot be read: ") + error.what());
    }
}

}  // namespace fleet
