// GET and DELETE /v1/depot

#include "host/depot/depot.h"

#include <nlohmann/json.hpp>

#include "host/api/call.h"
#include "host/api/depot/depot_documents.h"
#include "host/api/route.h"
#include "host/api/services.h"
#include "host/guard/refusal.h"

namespace host {

Endpoint getDepot, deleteDepot;

Answer getDepot(Services& services, const Call& call) {
    const std::string* const given = call.text("path");
    const std::string path = given != nullptr ? *given : "";
    const DepotListing listing = services.depotFiles.list(path);
    nlohmann::ordered_json document;
    putName(document, "path", path);
    const bool isDirectory = listing.self.type == DepotEntry::Type::Directory;
    document["type"] = documentOf(listing.self)["type"];
    document["entries"] = nlohmann::ordered_json::array();
    for (const DepotEntry& entry : listing.entries)
        document["entries"].push_back(documentOf(entry));
    if (!isDirectory) document["entries"].push_back(documentOf(listing.self));
    document["complete"] = listing.complete;
    return jsonReply(200, document.dump());
}

Answer deleteDepot(Services& services, const Call& call) {
    const std::string& path = call.required("path");
    if (services.guarded &&
        services.transfers.isReceiving(services.transferRules.destination(path))) {
        throw Refusal("depot-transfers", "a client is just sending " + path,
                      "Wait until it has ended, and remove it then.");
    }
    services.depotFiles.remove(path, call.flag("recursive"));
    nlohmann::ordered_json document;
    putName(document, "removed", path);
    return jsonReply(200, document.dump());
}

}  // namespace host
