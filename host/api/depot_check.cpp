// GET /v1/depot/check

#include <nlohmann/json.hpp>

#include "host/api/call.h"
#include "host/api/depot_documents.h"
#include "host/api/route.h"
#include "host/api/services.h"

namespace host {

Endpoint getDepotCheck;

namespace {

using nlohmann::ordered_json;

std::optional<Objection> objectionTo(Services& services, const std::string& name) {
    // The plug-in refuses this by itself, guarded or not.
    if (std::string reason = services.transferRules.whyImpossible(name); !reason.empty()) {
        return Objection{"", std::move(reason), ""};
    }
    return services.transfers.objectionTo(name);
}

void putObjection(ordered_json& document, const Objection& objection) {
    document["error"] = objection.reason;
    if (!objection.guard.empty()) document["guard"] = objection.guard;
    if (!objection.hint.empty()) document["hint"] = objection.hint;
}

/// False when the file would not be taken.
bool putFile(ordered_json& files, Services& services, const std::string& name) {
    ordered_json file;
    putName(file, "path", name);
    const auto objection = objectionTo(services, name);
    file["taken"] = !objection;
    file["converted"] = services.transferRules.isConverted(name);
    const auto arrival = services.transferRules.arrivalName(name);
    file["replaces"] = arrival && services.depotFiles.holds(*arrival);
    if (objection) putObjection(file, *objection);
    files.push_back(std::move(file));
    return !objection;
}

/// What the files occupy that the push would replace.
std::uint64_t replaced(const Services& services, const std::vector<std::string>& names) {
    std::uint64_t bytes = 0;
    for (const std::string& name : names) {
        if (const auto arrival = services.transferRules.arrivalName(name)) {
            bytes += services.depotFiles.bytesAt(*arrival);
        }
    }
    return bytes;
}

Objection tooLittleSpace(std::uint64_t needed, std::uint64_t free) {
    return {"depot-space",
            "the push needs " + std::to_string(needed) + " bytes, and the depot has room for " +
                std::to_string(free),
            "Make room on its file system; zavctl depot rm removes what is no longer needed."};
}

}  // namespace

Answer getDepotCheck(Services& services, const Call& call) {
    const std::vector<std::string> names = call.texts("path");
    const std::uint64_t free = services.depotFiles.freeBytes();
    ordered_json files = ordered_json::array();
    bool taken = true;
    for (const std::string& name : names)
        taken = putFile(files, services, name) && taken;
    ordered_json document;
    const auto needed = static_cast<std::uint64_t>(call.number("bytes", 0));
    const std::uint64_t freed = replaced(services, names);
    const bool fits = !services.guarded || needed <= free + freed;
    document["guarded"] = services.guarded;
    document["taken"] = taken && fits;
    document["free_bytes"] = free;
    document["replaced_bytes"] = freed;
    if (!fits) putObjection(document, tooLittleSpace(needed, free + freed));
    document["files"] = std::move(files);
    return jsonReply(200, document.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace));
}

}  // namespace host
