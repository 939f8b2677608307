// GET and POST /v1/files/{sha256}: an operator brings a file.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/schema.h"
#include "fleet/server/api/visit.h"

namespace fleet {

ApiEndpoint getFile, postFile;
Schema fileSchema;

namespace {

http::Reply fileReply(const std::string& sum, const DepotFile& file, bool isThere) {
    return http::jsonReply(
        200,
        textOf({{"sha256", sum}, {"size", file.size}, {"have", file.have}, {"complete", isThere}}));
}

std::uint64_t sizeGiven(const Call& call) {
    return static_cast<std::uint64_t>(call.number("size", 0));
}

}  // namespace

http::Answer getFile(Visit& visit, const Call& call) {
    const std::string& sum = call.required("sha256");
    const auto file = visit.services.files.find(sum, sizeGiven(call));
    if (!file) throw NothingThere("there is no such file");
    return fileReply(sum, *file, visit.services.files.has(sum));
}

http::Answer postFile(Visit& visit, const Call& call) {
    const std::string& sum = call.required("sha256");
    const auto from = static_cast<std::uint64_t>(call.number("from", 0));
    const DepotFile file =
        visit.services.files.add(sum, sizeGiven(call), from, call.bytes(), wallClock());
    return fileReply(sum, file, visit.services.files.has(sum));
}

nlohmann::ordered_json fileSchema(Components&) {
    return shape::object(
        "File", "A file on its way to hosts.",
        {{"sha256", shape::text("its SHA-256, by which it is named")},
         {"size", shape::wholeNumber("in bytes")},
         {"have", shape::wholeNumber("how many of them have come")},
         {"complete", shape::yesOrNo("whether it is all there, and is what its name says")}});
}

}  // namespace fleet
