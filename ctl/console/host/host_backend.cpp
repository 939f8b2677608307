#include "ctl/console/host/host_backend.h"

#include <algorithm>
#include <chrono>
#include <nlohmann/json.hpp>
#include <utility>

#include "ctl/console/host/host_request.h"
#include "ctl/console/refusals.h"
#include "ctl/console/request_check.h"

namespace console {
namespace {

constexpr std::string_view kHostDepot = "/console/depot";
constexpr std::chrono::seconds kReadTime{30};

std::string descriptionOf(const HostSettings& settings) {
    using nlohmann::json;
    const json document = {{"mode", "host"},
                           {"address", settings.host.socket},
                           {"program", "zavctl-console"},
                           {"version", ZAV_VERSION},
                           {"command", settings.command}};
    return document.dump(-1, ' ', false, json::error_handler_t::replace);
}

}  // namespace

HostBackend::HostBackend(HostSettings settings)
    : host_(settings.host),
      description_(descriptionOf(settings)),
      uploads_(std::move(settings.uploadDirectory)),
      room_(settings.answerRoom) {}

std::variant<http::Answer, http::Job> HostBackend::describe() {
    return http::Answer(http::jsonReply(200, description_));
}

std::variant<http::Answer, http::Job> HostBackend::handle(http::Request request) {
    const std::string_view path = pathOf(request);
    if (isOfInterface(path)) return hand(std::move(request));
    if (path != kHostDepot) {
        return http::Answer(refusalAt(path, 404, "there is nothing at this path"));
    }
    if (request.method != "PUT") return http::Answer(wrongMethodAt(path, "PUT"));
    return http::Answer(refusalAt(path, 411, "the file is the body, and there is none"));
}

http::BodyPlan HostBackend::planFor(const http::Request& head) {
    if (pathOf(head) == kHostDepot && head.method == "PUT") return uploads_.begin(head, host_);
    return {};
}

std::variant<http::Answer, http::Job> HostBackend::hand(http::Request request) {
    const bool reads = onlyReads(request);
    ctl::HostAddress host = host_;
    if (reads) host.timeout = std::min<std::chrono::milliseconds>(host.timeout, kReadTime);
    std::shared_ptr<void> turn = reads ? turns_.beginRead() : turns_.beginChange();
    if (!turn) {
        return http::Answer(
            refusalAt(pathOf(request), 503, "too many questions wait for the host"));
    }
    return [this, turn = std::move(turn), host = std::move(host),
            request = std::move(request)]() -> http::Answer {
        return passOn(request, host, streams_, room_);
    };
}

}  // namespace console
