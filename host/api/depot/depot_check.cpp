// GET /v1/depot/check

#include <sys/stat.h>

#include <nlohmann/json.hpp>

#include "host/api/depot/depot_documents.h"
#include "host/api/route.h"
#include "host/api/schema.h"
#include "host/api/services.h"

namespace host {

Endpoint getDepotCheck;
Schema depotCheckSchema;

namespace {

using nlohmann::ordered_json;

/// A name of the request, and its directory, which it mostly shares with the names around it.
struct Arrival {
    const std::string& name;
    const std::string file;
    const ArrivalDirectory& directory;
};

/// Who names a directory mostly means a place in it.
std::string wayOut(const Services& services, const Arrival& arrival, const std::string& reason) {
    if (reason != arrival.directory.obstacleTo(arrival.file)) return "";
    const auto there = arrival.directory.find(arrival.file);
    if (!there || !S_ISDIR(there->st_mode)) return "";
    return "zavctl push FILE " + services.codePage.toUtf8(arrival.name) +
           "/ puts the file into it.";
}

std::optional<Objection> objectionTo(Services& services, const Arrival& arrival) {
    // The plug-in refuses this by itself, guarded or not.
    std::string reason = services.transferRules.whyImpossible(arrival.name, arrival.directory);
    if (!reason.empty()) {
        std::string hint = wayOut(services, arrival, reason);
        return Objection{"", std::move(reason), std::move(hint)};
    }
    return services.transfers.objectionTo(arrival.name,
                                          arrival.directory.realPath() + "/" + arrival.file);
}

void putObjection(ordered_json& document, const Objection& objection) {
    document["error"] = objection.reason;
    if (!objection.guard.empty()) document["guard"] = objection.guard;
    if (!objection.hint.empty()) document["hint"] = objection.hint;
}

/// What becomes of the files of a push.
struct PushVerdict {
    ordered_json files = ordered_json::array();
    bool taken = true;
    std::uint64_t freed = 0;  ///< bytes of what they would replace
};

/// Of the file that a push would replace. Another name keeps its blocks in use.
std::uint64_t freedBy(const struct stat& replaced) {
    const bool isOnlyName = S_ISREG(replaced.st_mode) && replaced.st_nlink == 1;
    return isOnlyName ? static_cast<std::uint64_t>(replaced.st_blocks) * 512 : 0;
}

void putFile(PushVerdict& verdict, Services& services, const Arrival& arrival) {
    ordered_json file;
    putName(file, "path", arrival.name);
    const auto objection = objectionTo(services, arrival);
    file["taken"] = !objection;
    file["converted"] = services.transferRules.isConverted(arrival.name);
    const auto there = arrival.directory.find(arrival.file);
    file["replaces"] = there && !S_ISDIR(there->st_mode);
    if (there) verdict.freed += freedBy(*there);
    if (objection) putObjection(file, *objection);
    verdict.taken = verdict.taken && !objection;
    verdict.files.push_back(std::move(file));
}

PushVerdict lookAt(Services& services, const std::vector<std::string>& names) {
    const TransferRules& rules = services.transferRules;
    PushVerdict verdict;
    ArrivalDirectory directory = rules.directoryOf("");
    for (const std::string& name : names) {
        if (!rules.isIn(name, directory)) directory = rules.directoryOf(name);
        putFile(verdict, services, {name, rules.fileOf(name), directory});
    }
    return verdict;
}

Objection tooLittleSpace(std::uint64_t needed, std::uint64_t free) {
    return {"depot-space",
            "the push needs " + std::to_string(needed) + " bytes, and the depot has room for " +
                std::to_string(free),
            "Make room on its file system; zavctl depot rm removes what is no longer needed."};
}

}  // namespace

http::Answer getDepotCheck(Services& services, const Call& call) {
    const std::uint64_t free = services.depotFiles.freeBytes();
    PushVerdict verdict = lookAt(services, call.texts("path"));
    ordered_json document;
    const auto needed = static_cast<std::uint64_t>(call.number("bytes", 0));
    const bool fits = !services.guarded || needed <= free + verdict.freed;
    document["guarded"] = services.guarded;
    document["taken"] = verdict.taken && fits;
    document["free_bytes"] = free;
    document["replaced_bytes"] = verdict.freed;
    if (!fits) putObjection(document, tooLittleSpace(needed, free + verdict.freed));
    document["files"] = std::move(verdict.files);
    return http::jsonReply(200,
                           document.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace));
}

namespace {

std::vector<shape::Property> withObjection(std::vector<shape::Property> properties) {
    properties.push_back({"error", shape::text("why it would not be taken"), Need::Optional});
    properties.push_back({"guard", shape::text("the guard that says so"), Need::Optional});
    properties.push_back({"hint", shape::text("the way out"), Need::Optional});
    return properties;
}

}  // namespace

nlohmann::ordered_json depotCheckSchema(Components&) {
    const nlohmann::ordered_json file = shape::object(
        "DepotCheckedFile", "Whether the host would take one file.",
        withObjection({{"path", shape::text("its name to be")},
                       {"escaped", escapedShape(), Need::Optional},
                       {"taken", shape::yesOrNo("whether the host would take it")},
                       {"converted", shape::yesOrNo("whether its line ends are converted")},
                       {"replaces", shape::yesOrNo("whether there is a file of that name")}}));
    return shape::object(
        "DepotCheck", "Whether the host would take files.",
        withObjection({{"guarded", shape::yesOrNo("whether guards look at transfers")},
                       {"taken", shape::yesOrNo("whether it would take all of them")},
                       {"free_bytes", shape::wholeNumber("the free space")},
                       {"replaced_bytes", shape::wholeNumber("what they would replace")},
                       {"files", shape::listOf("in the order of the request", file)}}));
}

}  // namespace host
