#include "ctl/console/console_handler.h"

#include <algorithm>
#include <chrono>
#include <nlohmann/json.hpp>
#include <utility>

#include "ctl/console/host_request.h"
#include "ctl/console/refusals.h"
#include "ctl/console/request_check.h"
#include "http/url.h"

namespace console {
namespace {

constexpr std::string_view kOpen = "/open";
constexpr std::string_view kSession = "/console/session";
constexpr std::string_view kDepot = "/console/depot";
/// A page that asks and goes away must not keep those from their turn who want something done.
constexpr int kMostReads = 12;
constexpr std::chrono::seconds kReadTime{30};

std::string descriptionOf(const ConsoleSettings& settings) {
    using nlohmann::json;
    const json document = {{"mode", "host"},
                           {"address", settings.host.socket},
                           {"program", "zavctl-console"},
                           {"version", ZAV_VERSION},
                           {"command", settings.command}};
    return document.dump(-1, ' ', false, json::error_handler_t::replace);
}

/// The only parameter, if it is the token.
std::string tokenIn(const http::Request& request) {
    const auto target = http::parseTarget(request.target);
    const bool hasToken =
        target && target->parameters.size() == 1 && target->parameters.front().first == "token";
    return hasToken ? target->parameters.front().second : "";
}

/// Counts while it lives, copies included.
std::shared_ptr<void> counted(std::shared_ptr<std::atomic<int>> count) {
    ++*count;
    std::atomic<int>* const counter = count.get();
    return {counter, [count = std::move(count)](void*) { --*count; }};
}

}  // namespace

ConsoleHandler::ConsoleHandler(ConsoleSettings settings, std::uint16_t port)
    : host_(settings.host),
      port_(port),
      description_(descriptionOf(settings)),
      page_(std::move(settings.page)),
      session_(std::move(settings.clock)),
      uploads_(std::move(settings.uploadDirectory)) {}

std::string ConsoleHandler::opening() const {
    return std::string(kOpen) + "?token=" + session_.token();
}

std::variant<http::Answer, http::Job> ConsoleHandler::handle(http::Request request) {
    const std::string path(pathOf(request));
    if (path == kOpen) return http::Answer(open(request));
    if (auto refusal = refusalOf(request)) return http::Answer(std::move(*refusal));
    if (!isForPrograms(path)) return http::Answer(page_.answer(request));
    if (path == "/v1" || path.substr(0, 4) == "/v1/") {
        if (onlyReads(request) && *reads_ >= kMostReads) {
            return http::Answer(refusalAt(path, 503, "too many questions wait for the host"));
        }
        return hand(std::move(request));
    }
    return http::Answer(answerOwn(request));
}

http::BodyPlan ConsoleHandler::planFor(const http::Request& head) {
    if (auto refusal = refusalOf(head)) return std::move(*refusal);
    if (pathOf(head) == kDepot && head.method == "PUT") return uploads_.begin(head, host_);
    return {};
}

const std::vector<std::string>& ConsoleHandler::wantedFields() const {
    return lookedAtFields();
}

const http::Fields& ConsoleHandler::commonFields() const {
    static const http::Fields kFields = {
        {"Content-Security-Policy",
         "default-src 'none'; script-src 'self'; style-src 'self'; img-src 'self'; connect-src "
         "'self'; base-uri 'none'; form-action 'none'; frame-ancestors 'none'"},
        {"X-Content-Type-Options", "nosniff"},
        {"Referrer-Policy", "no-referrer"},
        {"Cross-Origin-Opener-Policy", "same-origin"},
        {"Cross-Origin-Resource-Policy", "same-origin"},
        {"Cache-Control", "no-store"}};
    return kFields;
}

bool ConsoleHandler::quiet() const {
    return *changes_ == 0 && uploads_.empty();
}

std::optional<http::Reply> ConsoleHandler::refusalOf(const http::Request& request) const {
    const std::string_view path = pathOf(request);
    // A target with a host of its own would be another one to whoever reads it another way.
    if (path.empty() || path.front() != '/') return refusalAt(path, 400, "a target is a path");
    const std::string complaint = complaintAbout(request, port_);
    if (!complaint.empty()) return refusalAt(path, 403, complaint);
    if (isOfAnotherSite(request)) return refusalAt(path, 403, "another page may not ask for this");
    if (!session_.isIn(fieldOf(request, "Cookie"))) {
        return refusalAt(path, 401,
                         "this browser has no session here, or it is over: \"zavctl console\" "
                         "prints a new link");
    }
    return std::nullopt;
}

http::Reply ConsoleHandler::open(const http::Request& request) {
    const std::string complaint = complaintAbout(request, port_);
    if (!complaint.empty()) return refusalAt(kOpen, 403, complaint);
    // What looks at a link before it is followed must not use it up.
    if (request.method != "GET") return wrongMethodAt(kOpen, "GET");
    const auto cookie = session_.open(tokenIn(request), fieldOf(request, "Cookie"));
    if (!cookie) {
        return refusalAt(kOpen, 403,
                         "this link is wrong, or it has been used: \"zavctl console\" prints a new "
                         "one");
    }
    http::Reply reply{303, "", "text/html; charset=utf-8"};
    reply.fields = {{"Location", "/"},
                    {"Set-Cookie", std::string(kCookieName) + "=" + *cookie +
                                       "; HttpOnly; SameSite=Strict; Path=/"}};
    return reply;
}

http::Reply ConsoleHandler::answerOwn(const http::Request& request) const {
    const std::string_view path = pathOf(request);
    if (path == kSession) {
        if (!onlyReads(request)) return wrongMethodAt(path, "GET, HEAD");
        return http::jsonReply(200, description_);
    }
    if (path != kDepot) return refusalAt(path, 404, "there is nothing at this path");
    if (request.method != "PUT") return wrongMethodAt(path, "PUT");
    return refusalAt(path, 411, "the file is the body, and there is none");
}

http::Job ConsoleHandler::hand(http::Request request) {
    const bool reads = onlyReads(request);
    ctl::HostAddress host = host_;
    if (reads) host.timeout = std::min<std::chrono::milliseconds>(host.timeout, kReadTime);
    std::shared_ptr<void> turn = counted(reads ? reads_ : changes_);
    return [this, turn = std::move(turn), host = std::move(host),
            request = std::move(request)]() -> http::Answer {
        return passOn(request, host, streams_);
    };
}

}  // namespace console
