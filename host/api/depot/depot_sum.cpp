// GET /v1/depot/sum
//
// Large files take long, so that threads of their own compute sums, a few requests at a time:
// however many there are, the workers are free for other requests.

#include <memory>
#include <nlohmann/json.hpp>

#include "host/api/depot/depot_documents.h"
#include "host/api/route.h"
#include "host/api/schema.h"
#include "host/api/services.h"
#include "host/depot/depot_error.h"
#include "http/responder.h"

namespace host {
namespace {

constexpr std::chrono::hours kLongest{1};

http::Reply tryAgain(const char* reason) {
    http::Reply reply = http::errorReply(503, reason);
    reply.fields.emplace_back("Retry-After", "5");
    return reply;
}

nlohmann::ordered_json sumOf(const Depot& depot, const std::string& path) {
    nlohmann::ordered_json file;
    putName(file, "path", path);
    try {
        const Checksum sum = depot.sum(path);
        file["bytes"] = sum.bytes;
        file["sha256"] = sum.sha256;
    } catch (const DepotError& error) {
        file["error"] = error.what();
    }
    return file;
}

/// One request in the course of its computation.
struct Sums {
    Services& services;
    const std::vector<std::string> paths;
    const http::Responder responder;
    nlohmann::ordered_json files = nlohmann::ordered_json::array();
};

http::Reply replyWith(nlohmann::ordered_json files) {
    const nlohmann::ordered_json document = {{"files", std::move(files)}};
    return http::jsonReply(200,
                           document.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace));
}

/// Computes the next sum. Between two of them other requests have their turn, if there is room to
/// wait for another one.
void advance(const std::shared_ptr<Sums>& sums) {
    try {
        do {
            const std::string& path = sums->paths[sums->files.size()];
            sums->files.push_back(sumOf(sums->services.depotFiles, path));
            if (sums->files.size() == sums->paths.size()) {
                return sums->responder(replyWith(std::move(sums->files)));
            }
        } while (!sums->services.checksums.submit([sums] { advance(sums); }));
    } catch (const std::exception& error) {
        sums->responder(http::errorReply(500, error.what()));
    }
}

}  // namespace

Endpoint getDepotSum;
Schema depotSumsSchema;

http::Answer getDepotSum(Services& services, const Call& call) {
    const auto begin = [&services, paths = call.texts("path")](const http::Responder& responder) {
        const auto sums = std::make_shared<Sums>(Sums{services, paths, responder});
        const bool taken = services.checksums.submit([sums] { advance(sums); });
        if (!taken) responder(tryAgain("too many requests for checksums are waiting"));
    };
    const auto atLimit = []() -> http::Answer { return tryAgain("the checksums are not ready"); };
    return http::Later{begin, kLongest, atLimit};
}

nlohmann::ordered_json depotSumsSchema(Components&) {
    const nlohmann::ordered_json sum =
        shape::object("DepotSum", "The checksum of a file, or why it has none.",
                      {{"path", shape::text("the file")},
                       {"escaped", escapedShape(), Need::Optional},
                       {"bytes", shape::wholeNumber("its size"), Need::Optional},
                       {"sha256", shape::text("the checksum, 64 digits"), Need::Optional},
                       {"error", shape::text("why there is none"), Need::Optional}});
    return shape::object("DepotSums", "Checksums of files.",
                         {{"files", shape::listOf("in the order of the request", sum)}});
}

}  // namespace host
