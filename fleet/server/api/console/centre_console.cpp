#include "fleet/server/api/console/centre_console.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <utility>

#include "ctl/console/refusals.h"
#include "ctl/console/request_check.h"
#include "ctl/show/shell_quoted.h"
#include "fleet/bus/messages/document.h"
#include "fleet/https/client/server_url.h"
#include "http/url.h"

namespace fleet {
namespace {

constexpr std::string_view kOpenPath = "/open";
constexpr std::string_view kSessionPath = "/console/session";
constexpr std::string_view kHttpsPort = "443";
constexpr const char* kNoSession =
    "this browser has no session here, or it is over: \"zavctl console --at-centre\" prints a new "
    "link";

/// Browsers write names in small letters, and leave out the port that goes without saying.
std::string hostFieldOf(const ServerUrl& url) {
    ServerUrl lower = url;
    std::transform(lower.host.begin(), lower.host.end(), lower.host.begin(), [](char letter) {
        return letter >= 'A' && letter <= 'Z' ? static_cast<char>(letter - 'A' + 'a') : letter;
    });
    std::string field = lower.authority();
    if (url.port == kHttpsPort) field.resize(field.size() - kHttpsPort.size() - 1);
    return field;
}

/// Cookies know no ports, and several fleets may have their centres on one machine. A browser takes
/// a name with this prefix only by HTTPS, for this very host and for all of its paths.
std::string cookieNameOf(const ServerUrl& url) {
    return "__Host-zav_console_" + url.port;
}

bool hasField(const http::Request& request, std::string_view name) {
    return std::any_of(request.fields.begin(), request.fields.end(),
                       [name](const auto& field) { return field.first == name; });
}

bool isProgram(const http::Request& request) {
    return console::isOfInterface(console::pathOf(request)) && !hasField(request, "Cookie");
}

/// The value of a cookie; empty if it is not there, or more than once.
std::string_view cookieIn(std::string_view cookies, std::string_view name) {
    std::string_view value;
    bool isThere = false;
    while (!cookies.empty()) {
        const std::size_t end = std::min(cookies.find(';'), cookies.size());
        std::string_view cookie = cookies.substr(0, end);
        cookies.remove_prefix(std::min(end + 1, cookies.size()));
        cookie.remove_prefix(std::min(cookie.find_first_not_of(' '), cookie.size()));
        const std::size_t equals = cookie.find('=');
        if (equals == std::string_view::npos || cookie.substr(0, equals) != name) continue;
        if (isThere) return {};
        isThere = true;
        value = cookie.substr(equals + 1);
    }
    return value;
}

}  // namespace

CentreConsole::CentreConsole(ApiServices& services, CentreApi& api,
                             std::vector<console::PageFile> page)
    : services_(services),
      api_(api),
      host_(hostFieldOf(readServerUrl(services.facts.url))),
      cookie_(cookieNameOf(readServerUrl(services.facts.url))),
      page_(std::move(page)) {}

std::string CentreConsole::openingFor(const std::string& token) {
    return std::string(kOpenPath) + "?token=" + token;
}

std::variant<http::Answer, http::Job> CentreConsole::handle(http::Request request) {
    if (isProgram(request)) return api_.handle(std::move(request));
    if (auto refusal = refusalOf(request)) return http::Answer(std::move(*refusal));
    const std::string path(console::pathOf(request));
    if (path == kOpenPath) return http::Answer(open(request));
    const std::string token = tokenOf(request);
    if (!services_.browsers.keyOf(token, wallClock())) {
        return http::Answer(console::refusalAt(path, 401, kNoSession));
    }
    if (console::isOfInterface(path)) return api_.handleForBrowser(std::move(request), token);
    if (path == kSessionPath) return [this, token] { return describe(token); };
    if (!console::isForPrograms(path)) return http::Answer(page_.answer(request));
    return http::Answer(console::refusalAt(path, 404, "there is nothing at this path"));
}

http::BodyPlan CentreConsole::planFor(const http::Request& head) {
    if (isProgram(head)) return {};
    if (auto refusal = refusalOf(head)) return std::move(*refusal);
    return {};
}

const std::vector<std::string>& CentreConsole::wantedFields() const {
    return console::lookedAtFields();
}

const http::Fields& CentreConsole::commonFields() const {
    return console::pageFields();
}

/// Whatever a browser asks for must pass here. What a page of somebody else's could send is refused
/// even though it only reads: its answers are nobody else's business.
std::optional<http::Reply> CentreConsole::refusalOf(const http::Request& request) const {
    const std::string_view path = console::pathOf(request);
    // A target with a host of its own would be another one to whoever reads it another way.
    if (path.empty() || path.front() != '/') {
        return console::refusalAt(path, 400, "a target is a path");
    }
    if (console::fieldOf(request, "Host") != host_) {
        return console::refusalAt(path, 403, "the console answers to its own address only");
    }
    if (!console::onlyReads(request)) {
        return console::refusalAt(path, 403,
                                  "a browser only looks here: what changes something is done with "
                                  "zavctl, where the operator's key is");
    }
    const bool isForeign =
        hasField(request, "Origin") && console::fieldOf(request, "Origin") != "https://" + host_;
    if (isForeign || console::isOfAnotherSite(request)) {
        return console::refusalAt(path, 403, "another page may not ask for this");
    }
    return std::nullopt;
}

std::string CentreConsole::tokenOf(const http::Request& request) const {
    return std::string(cookieIn(console::fieldOf(request, "Cookie"), cookie_));
}

http::Reply CentreConsole::open(const http::Request& request) {
    // What looks at a link before it is followed must not use it up.
    if (request.method != "GET") return console::wrongMethodAt(kOpenPath, "GET");
    const auto target = http::parseTarget(request.target);
    const bool hasToken =
        target && target->parameters.size() == 1 && target->parameters.front().first == "token";
    const auto session =
        hasToken ? services_.browsers.open(target->parameters.front().second, wallClock())
                 : std::nullopt;
    if (!session) {
        return console::refusalAt(kOpenPath, 403,
                                  "this link is wrong, too old, or has been used: \"zavctl console "
                                  "--at-centre\" prints a new one");
    }
    http::Reply reply{303, "", "text/html; charset=utf-8"};
    reply.fields = {
        {"Location", "/"},
        {"Set-Cookie", cookie_ + "=" + *session + "; Secure; HttpOnly; SameSite=Strict; Path=/"}};
    return reply;
}

/// What the operator may do in whose name the session was opened.
std::optional<OperatorGrant> CentreConsole::grantOf(const std::string& token) const {
    const Moment now = wallClock();
    const auto key = services_.browsers.keyOf(token, now);
    if (!key) return std::nullopt;
    return services_.withTrust(
        [&](sqlite::Database& database) { return Operators(database).grantOf(*key, now); });
}

/// What the page is to know of its session. On a worker thread.
http::Answer CentreConsole::describe(const std::string& token) const {
    const auto grant = grantOf(token);
    if (!grant) return console::refusalAt(kSessionPath, 401, kNoSession);
    const std::string& url = services_.facts.url;
    return http::jsonReply(200, textOf({{"mode", "fleet"},
                                        {"address", url},
                                        {"fleet", services_.facts.fleet},
                                        {"operator", grant->name},
                                        {"role", textOf(grant->role)},
                                        {"command", "zavctl --fleet " + ctl::shellQuoted(url)},
                                        {"push", false},
                                        {"onlyLooks", true},
                                        {"program", "zavfleetd"},
                                        {"version", ZAV_VERSION}}));
}

}  // namespace fleet
