#include "fleet/operator/console/fleet_backend.h"

#include <exception>
#include <nlohmann/json.hpp>
#include <string_view>
#include <system_error>
#include <utility>

#include "ctl/client/failure.h"
#include "ctl/console/refusals.h"
#include "ctl/console/request_check.h"
#include "ctl/show/shell_quoted.h"
#include "fleet/bus/messages/document.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/console/runs/run_request.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::string_view kRun = "/console/run";
constexpr std::string_view kOutput = "/console/output";
constexpr std::string_view kFleetDepot = "/console/depot";

http::Answer noRead() {
    return console::refusalAt("/v1", 503, "too many questions wait for the centre");
}

/// As far as the certificate tells: hosts go by that.
const char* roleBy(const Certificate& grant) {
    return grant.commands.empty() ? "viewer" : "operator";
}

}  // namespace

FleetBackend::FleetBackend(Settings settings)
    : identity_(std::move(settings.identity)),
      grant_(identity_.grant()),
      session_(identity_),
      reads_(identity_, session_, settings.readTime),
      outputs_(identity_, session_, settings.outputTime),
      runs_(std::move(settings.program), settings.runs),
      uploads_(std::move(settings.uploadDirectory), identity_.url,
               [this](RunRequest request) { return start(std::move(request)); }) {}

std::variant<http::Answer, http::Job> FleetBackend::describe() {
    std::shared_ptr<void> turn = turns_.beginRead();
    if (!turn) return noRead();
    return [this, turn = std::move(turn)] { return description(); };
}

std::variant<http::Answer, http::Job> FleetBackend::handle(http::Request request) {
    const std::string_view path = console::pathOf(request);
    if (console::isOfInterface(path)) return read(std::move(request));
    if (path == kRun) return run(std::move(request));
    if (path == kOutput) return follow(request);
    if (path != kFleetDepot) {
        return http::Answer(console::refusalAt(path, 404, "there is nothing at this path"));
    }
    if (request.method != "PUT") return http::Answer(console::wrongMethodAt(path, "PUT"));
    return http::Answer(console::refusalAt(path, 411, "the file is the body, and there is none"));
}

http::BodyPlan FleetBackend::planFor(const http::Request& head) {
    const bool isUpload = console::pathOf(head) == kFleetDepot && head.method == "PUT";
    return isUpload ? uploads_.begin(head) : http::BodyPlan();
}

void FleetBackend::prepareForEnd() {
    outputs_.stopAll();
    runs_.stopAll();
}

std::variant<http::Answer, http::Job> FleetBackend::read(http::Request request) {
    if (!console::onlyReads(request)) {
        return http::Answer(console::wrongMethodAt(console::pathOf(request), "GET, HEAD"));
    }
    std::shared_ptr<void> turn = turns_.beginRead();
    if (!turn) return noRead();
    return [this, turn = std::move(turn), request = std::move(request)] {
        return reads_.answer(request);
    };
}

std::variant<http::Answer, http::Job> FleetBackend::run(http::Request request) {
    if (request.method != "POST") return http::Answer(console::wrongMethodAt(kRun, "POST"));
    return [this, turn = turns_.beginChange(), body = std::move(request.body)]() -> http::Answer {
        try {
            return start(readRunRequest(body, identity_.url));
        } catch (const ctl::Failure& failure) {
            return console::replyTo(failure);
        }
    };
}

http::Answer FleetBackend::start(RunRequest request) {
    try {
        return runs_.begin(std::move(request));
    } catch (const std::system_error& error) {
        return http::errorReply(500, error.what());
    }
}

http::Answer FleetBackend::follow(const http::Request& request) {
    if (!console::onlyReads(request)) return console::wrongMethodAt(kOutput, "GET, HEAD");
    if (request.method == "HEAD") return http::Reply{200, "", "text/event-stream"};
    // It has the operator's key sign questions.
    if (!console::isOfPage(request)) {
        return console::refusalAt(kOutput, 403, "this needs the field X-Zav-Console: 1");
    }
    try {
        return outputs_.begin(readOutputRequest(request));
    } catch (const ctl::Failure& failure) {
        return console::replyTo(failure);
    } catch (const std::system_error& error) {
        return http::errorReply(500, error.what());
    }
}

/// What the certificate says holds while the centre is away.
http::Answer FleetBackend::description() {
    json document = {{"mode", "fleet"},
                     {"address", identity_.url},
                     {"fleet", identity_.fleet},
                     {"operator", grant_.name},
                     {"role", roleBy(grant_)},
                     {"command", "zavctl --fleet " + ctl::shellQuoted(identity_.url)},
                     {"push", true},
                     {"program", "zavctl-fleet"},
                     {"version", ZAV_VERSION}};
    try {
        const std::string role = memberText(documentIn(reads_.get("/v1/whoami")), "role");
        if (!role.empty()) document["role"] = role;
    } catch (const HttpsError&) {
    } catch (const ctl::Failure&) {
    }
    return http::jsonReply(200, textOf(document));
}

}  // namespace fleet
