// GET and DELETE /v1/depot

#include "host/depot/depot.h"

#include <nlohmann/json.hpp>

#include "host/api/depot/depot_documents.h"
#include "host/api/route.h"
#include "host/api/schema.h"
#include "host/api/services.h"
#include "host/guard/refusal.h"

namespace host {

Endpoint getDepot, deleteDepot;
Schema depotListingSchema, depotRemovalSchema, depotEntrySchema;

http::Answer getDepot(Services& services, const Call& call) {
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
    return http::jsonReply(200, document.dump());
}

http::Answer deleteDepot(Services& services, const Call& call) {
    const std::string& path = call.required("path");
    if (services.guarded &&
        services.transfers.isReceiving(services.transferRules.destination(path))) {
        throw Refusal("depot-transfers", "a client is just sending " + path,
                      "Wait until it has ended, and remove it then.");
    }
    services.depotFiles.remove(path, call.flag("recursive"));
    nlohmann::ordered_json document;
    putName(document, "removed", path);
    return http::jsonReply(200, document.dump());
}

nlohmann::ordered_json depotListingSchema(Components& components) {
    return shape::object(
        "DepotListing", "A directory of the depot, or one file.",
        {{"path", shape::text("what was asked for")},
         {"escaped", escapedShape(), Need::Optional},
         {"type", shape::about("what it is", depotTypeShape())},
         {"entries", shape::listOf("in the order of their names; of a file its own",
                                   components.ref(depotEntrySchema))},
         {"complete", shape::yesOrNo("false: there are more than 10,000 entries")}});
}

nlohmann::ordered_json depotRemovalSchema(Components&) {
    return shape::object(
        "DepotRemoval", "What has been removed.",
        {{"removed", shape::text("the path")}, {"escaped", escapedShape(), Need::Optional}});
}

}  // namespace host
