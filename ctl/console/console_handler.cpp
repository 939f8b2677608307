#include "ctl/console/console_handler.h"

#include <string_view>
#include <utility>

#include "ctl/console/refusals.h"
#include "ctl/console/request_check.h"
#include "http/url.h"

namespace console {
namespace {

constexpr std::string_view kOpen = "/open";
constexpr std::string_view kSession = "/console/session";

/// The only parameter, if it is the token.
std::string tokenIn(const http::Request& request) {
    const auto target = http::parseTarget(request.target);
    const bool hasToken =
        target && target->parameters.size() == 1 && target->parameters.front().first == "token";
    return hasToken ? target->parameters.front().second : "";
}

}  // namespace

ConsoleHandler::ConsoleHandler(ConsoleSettings settings, Backend& backend, std::uint16_t port)
    : backend_(backend),
      port_(port),
      page_(std::move(settings.page)),
      session_(std::move(settings.clock)) {}

std::string ConsoleHandler::opening() const {
    return std::string(kOpen) + "?token=" + session_.token();
}

std::variant<http::Answer, http::Job> ConsoleHandler::handle(http::Request request) {
    const std::string path(pathOf(request));
    if (path == kOpen) return http::Answer(open(request));
    if (auto refusal = refusalOf(request)) return http::Answer(std::move(*refusal));
    if (!isForPrograms(path)) return http::Answer(page_.answer(request));
    if (path != kSession) return backend_.handle(std::move(request));
    if (!onlyReads(request)) return http::Answer(wrongMethodAt(path, "GET, HEAD"));
    return backend_.describe();
}

http::BodyPlan ConsoleHandler::planFor(const http::Request& head) {
    if (auto refusal = refusalOf(head)) return std::move(*refusal);
    return isForPrograms(pathOf(head)) ? backend_.planFor(head) : http::BodyPlan();
}

const std::vector<std::string>& ConsoleHandler::wantedFields() const {
    return lookedAtFields();
}

const http::Fields& ConsoleHandler::commonFields() const {
    return pageFields();
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

}  // namespace console
