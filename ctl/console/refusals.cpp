#include "ctl/console/refusals.h"

#include <nlohmann/json.hpp>
#include <string>

namespace console {
namespace {

bool isBelow(std::string_view path, std::string_view folder) {
    return path.substr(0, folder.size()) == folder &&
           (path.size() == folder.size() || path[folder.size()] == '/');
}

unsigned statusFor(const ctl::Failure& failure) {
    switch (failure.status()) {
        case ctl::kWrongUsage:
            return 400;
        case ctl::kHostReportedFailure:
            return 409;
        case ctl::kNoOutcome:
            return 504;
        default:
            return 502;
    }
}

}  // namespace

bool isOfInterface(std::string_view path) {
    return isBelow(path, "/v1");
}

bool isForPrograms(std::string_view path) {
    return isOfInterface(path) || isBelow(path, "/console");
}

http::Reply refusalAt(std::string_view path, unsigned status, std::string_view text) {
    if (isForPrograms(path)) return http::errorReply(status, text);
    return {status,
            "<!doctype html>\n<html lang=\"en\">\n<meta charset=\"utf-8\">\n<title>zavctl "
            "console</title>\n<p>" +
                std::string(text) + ".</p>\n</html>\n",
            "text/html; charset=utf-8"};
}

http::Reply wrongMethodAt(std::string_view path, std::string_view allowed) {
    http::Reply reply = refusalAt(path, 405, "this path knows other methods only");
    reply.fields.emplace_back("Allow", std::string(allowed));
    return reply;
}

http::Reply replyTo(const ctl::Failure& failure) {
    using nlohmann::json;
    json document = {{"error", failure.what()}};
    if (!failure.guard().empty()) document["guard"] = failure.guard();
    if (!failure.hint().empty()) document["hint"] = failure.hint();
    return http::jsonReply(statusFor(failure),
                           document.dump(-1, ' ', false, json::error_handler_t::replace));
}

}  // namespace console
