// GET /v1/depot/sum

#include <nlohmann/json.hpp>

#include "host/api/call.h"
#include "host/api/depot_documents.h"
#include "host/api/route.h"
#include "host/api/services.h"
#include "host/depot/depot_error.h"

namespace host {

Endpoint getDepotSum;

Answer getDepotSum(Services& services, const Call& call) {
    nlohmann::ordered_json files = nlohmann::ordered_json::array();
    for (const std::string& path : call.texts("path")) {
        nlohmann::ordered_json file;
        putName(file, "path", path);
        try {
            const Checksum sum = services.depotFiles.sum(path);
            file["bytes"] = sum.bytes;
            file["sha256"] = sum.sha256;
        } catch (const DepotError& error) {
            file["error"] = error.what();
        }
        files.push_back(std::move(file));
    }
    const nlohmann::ordered_json document = {{"files", std::move(files)}};
    return jsonReply(200, document.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace));
}

}  // namespace host
