// ctest-label: threaded
// What the centre's console answers to browsers, with a real centre behind it.
#include "fleet/server/api/console/centre_console.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "fleet/https/client/server_url.h"
#include "fleet/server/keys/trust/revocations.h"
#include "tests/fleet/server/api/centre_interface.h"

namespace {

using centre_interface::CentreInterface;
using centre_interface::LoggedIn;
using fleet::Role;
using made_fleet::today;
using nlohmann::json;

class CentresConsole : public CentreInterface {
protected:
    CentresConsole() : CentreInterface(true) {
        console_ = std::make_unique<fleet::CentreConsole>(*services_, *api_, page());
    }

    static std::vector<console::PageFile> page() {
        return {{"/index.html", "text/html; charset=utf-8", "<!doctype html>", ""},
                {"/app.js", "text/javascript; charset=utf-8", "run()", ""}};
    }

    /// As a browser sends it that shows the page.
    http::Request request(const std::string& method, const std::string& target,
                          const std::string& cookie = "") const {
        http::Request request{method, target, "", {0, 0, 0, http::Access::Act}};
        request.fields = {{"Host", host()}, {"Sec-Fetch-Site", "same-origin"}};
        if (!cookie.empty()) request.fields.emplace_back("Cookie", cookie);
        return request;
    }
    http::Answer answer(http::Request request) const {
        auto handled = console_->handle(std::move(request));
        if (auto* const job = std::get_if<http::Job>(&handled)) return (*job)();
        return std::get<http::Answer>(std::move(handled));
    }
    http::Reply reply(http::Request request) const {
        return std::get<http::Reply>(answer(std::move(request)));
    }
    unsigned status(const std::string& method, const std::string& target,
                    const std::string& cookie = "") const {
        return reply(request(method, target, cookie)).status;
    }
    std::string host() const { return fleet::readServerUrl(services_->facts.url).authority(); }

    std::string linkOf(const LoggedIn& who) {
        const auto made = post("/v1/console-links", who);
        EXPECT_EQ(made.status, 201U) << made.document;
        return made.document.value("path", "");
    }
    static std::string fieldOf(const http::Reply& reply, const std::string& name) {
        const auto found = std::find_if(reply.fields.begin(), reply.fields.end(),
                                        [&](const auto& field) { return field.first == name; });
        return found == reply.fields.end() ? "" : found->second;
    }
    /// The cookie of a browser in which that operator's link has been opened.
    std::string open(const LoggedIn& who) {
        const std::string set = fieldOf(reply(request("GET", linkOf(who))), "Set-Cookie");
        return set.substr(0, set.find(';'));
    }
    json read(const std::string& target, const std::string& cookie) const {
        return json::parse(reply(request("GET", target, cookie)).body);
    }
    LoggedIn viewer() {
        return login({"vera", Role::Viewer, {}, {}, "env=test", made_fleet::kDay});
    }

    std::unique_ptr<fleet::CentreConsole> console_;
};

TEST_F(CentresConsole, IsOpenedByALinkOnce) {
    const LoggedIn ada = admin();
    const std::string link = linkOf(ada);
    EXPECT_EQ(status("HEAD", link), 405U) << "who looks at a link does not use it up";
    http::Request foreign = request("GET", link);
    foreign.fields[1].second = "cross-site";
    EXPECT_EQ(reply(std::move(foreign)).status, 403U) << "nobody is sent into another's session";
    http::Request typed = request("GET", link);
    typed.fields[1].second = "none";
    const http::Reply opened = reply(std::move(typed));
    EXPECT_EQ(opened.status, 303U);
    EXPECT_EQ(fieldOf(opened, "Location"), "/");
    const std::string set = fieldOf(opened, "Set-Cookie");
    EXPECT_EQ(set.rfind("__Host-zav_console_", 0), 0U) << set;
    EXPECT_NE(set.find("; Secure; HttpOnly; SameSite=Strict; Path=/"), std::string::npos) << set;
    EXPECT_EQ(set.find("Domain"), std::string::npos) << set;
    EXPECT_EQ(status("GET", link), 403U);
    EXPECT_EQ(status("GET", "/open"), 403U);
    EXPECT_EQ(status("GET", "/open?token=x"), 403U);
}

TEST_F(CentresConsole, ShowsItsPageInItsSessionOnly) {
    const std::string cookie = open(admin());
    EXPECT_EQ(reply(request("GET", "/", cookie)).body, "<!doctype html>");
    EXPECT_EQ(reply(request("GET", "/hosts", cookie)).body, "<!doctype html>");
    EXPECT_EQ(reply(request("GET", "/app.js", cookie)).body, "run()");
    EXPECT_EQ(status("GET", "/other.js", cookie), 404U);
    EXPECT_EQ(status("GET", "/console/run", cookie), 404U);
    for (const char* const other : {"", "a=b", "__Host-zav_console_1=x"}) {
        for (const char* const target : {"/", "/app.js", "/console/session"})
            EXPECT_EQ(status("GET", target, other), 401U) << target << " " << other;
    }
    EXPECT_EQ(status("GET", "/v1/hosts", "a=b"), 401U);
    EXPECT_EQ(status("GET", "/", cookie + "; " + cookie), 401U) << "two cookies are none";
}

TEST_F(CentresConsole, SaysThatItOnlyLooks) {
    const json session = read("/console/session", open(admin()));
    EXPECT_EQ(session["mode"], "fleet");
    EXPECT_EQ(session["operator"], "ada");
    EXPECT_EQ(session["role"], "admin");
    EXPECT_EQ(session["onlyLooks"], true);
    EXPECT_EQ(session["push"], false);
    EXPECT_EQ(session["command"], "zavctl --fleet " + services_->facts.url);
}

TEST_F(CentresConsole, ShowsAnOperatorOnlyTheirHosts) {
    join("web-1", {{"env", "test"}});
    join("web-2", {{"env", "prod"}});
    const std::string cookie = open(viewer());
    const json hosts = read("/v1/hosts", cookie)["hosts"];
    ASSERT_EQ(hosts.size(), 1U);
    EXPECT_EQ(hosts[0]["name"], "web-1");
    EXPECT_EQ(status("GET", "/v1/hosts/web-2", cookie), 404U);
    EXPECT_EQ(read("/v1/hosts", open(admin()))["hosts"].size(), 2U);
}

/// A route's path with what its parameters need.
std::string targetOf(const fleet::ApiRoute& route) {
    std::string target = route.path;
    for (const routes::Parameter& parameter : route.parameters) {
        const bool isInPath = target.find('{' + std::string(parameter.name) + '}') != target.npos;
        if (isInPath || parameter.need != routes::Need::Required) continue;
        target +=
            (target.find('?') == target.npos ? '?' : '&') + std::string(parameter.name) + "=1";
    }
    return target;
}

TEST_F(CentresConsole, ChangesNothingWhateverABrowserAsksFor) {
    const LoggedIn ada = admin();
    const std::string cookie = open(ada);
    std::size_t refused = 0;
    for (const fleet::ApiRoute& route : fleet::apiRoutes()) {
        const std::string target = targetOf(route);
        const bool reads = std::string(route.method) == "GET" && route.access != http::Access::Act;
        if (reads) continue;
        ++refused;
        http::Request asked = request(route.method, target, cookie);
        asked.fields.emplace_back("X-Zav-Console", "1");
        asked.fields.emplace_back("Origin", "https://" + host());
        asked.body = "{}";
        EXPECT_EQ(reply(asked).status, 403U) << route.method << " " << target;
        // Nor does an operator's session help that a page has got hold of.
        asked.authorization = "Bearer " + ada.session;
        EXPECT_EQ(reply(asked).status, 403U) << route.method << " " << target;
        const http::BodyPlan plan = console_->planFor(asked);
        const bool isUnread = std::holds_alternative<http::Reply>(plan);
        EXPECT_EQ(isUnread, std::string(route.method) != "GET") << target;
    }
    EXPECT_GT(refused, 15U);
    for (const char* const method : {"POST", "PUT", "DELETE", "OPTIONS", "PATCH", "TRACE"}) {
        for (const char* const target : {"/", "/open", "/console/session", "/console/run",
                                         "/console/depot?path=x&on=*", "/v1/hosts"}) {
            EXPECT_EQ(status(method, target, cookie), 403U) << method << " " << target;
        }
    }
    EXPECT_EQ(status("GET", "/v1/whoami", cookie), 200U) << "the session is still there";
}

TEST_F(CentresConsole, TakesNoSessionOfAnotherKind) {
    const LoggedIn ada = admin();
    const std::string cookie = open(ada);
    const std::string name = cookie.substr(0, cookie.find('='));
    const std::string token = cookie.substr(cookie.find('=') + 1);
    EXPECT_EQ(status("GET", "/v1/whoami", name + "=" + ada.session), 401U);
    EXPECT_EQ(ask("GET", "/v1/whoami", token).status, 401U);
    // A host's file goes to who shows a host's session; a browser's request shows none.
    join("web-1");
    const std::string hosts =
        ask("POST", "/v1/sessions", "", sessionRequest(signers_.at("web-1"))).document["session"];
    http::Request fetched =
        request("GET", "/v1/files/" + std::string(64, 'a') + "/content", cookie);
    fetched.authorization = "Bearer " + hosts;
    EXPECT_EQ(reply(std::move(fetched)).status, 401U);
}

TEST_F(CentresConsole, AnswersProgramsAsBefore) {
    const LoggedIn ada = admin();
    http::Request program{"GET", "/v1/whoami", "", {0, 0, 0, http::Access::Act}};
    program.authorization = "Bearer " + ada.session;
    program.fields = {{"Host", "anything"}};
    EXPECT_EQ(reply(program).status, 200U);
    EXPECT_TRUE(std::holds_alternative<std::monostate>(console_->planFor(program)));
    program.authorization.clear();
    EXPECT_EQ(reply(program).status, 401U);
    program.target = "/v1/health";
    EXPECT_EQ(reply(program).status, 200U);
}

TEST_F(CentresConsole, AnswersToItsOwnNameAndItsOwnPageOnly) {
    const std::string cookie = open(admin());
    for (const char* const target : {"/", "/v1/hosts", "/console/session"}) {
        EXPECT_EQ(status("GET", target, cookie), 200U) << target;
        for (const char* const other : {"elsewhere.example", "", "127.0.0.1:1"}) {
            http::Request asked = request("GET", target, cookie);
            asked.fields[0].second = other;
            EXPECT_EQ(reply(std::move(asked)).status, 403U) << target << " " << other;
        }
        for (const char* const site : {"cross-site", "same-site", "anything"}) {
            http::Request asked = request("GET", target, cookie);
            asked.fields[1].second = site;
            EXPECT_EQ(reply(std::move(asked)).status, 403U) << target << " " << site;
        }
        http::Request asked = request("GET", target, cookie);
        asked.fields.emplace_back("Origin", "https://elsewhere.example");
        EXPECT_EQ(reply(std::move(asked)).status, 403U) << target;
    }
    EXPECT_EQ(status("GET", "https://" + host() + "/", cookie), 400U);
    EXPECT_EQ(status("GET", "", cookie), 400U);
}

TEST_F(CentresConsole, EndsWithTheKeyThatHasOpenedIt) {
    const std::string cookie = open(admin());
    http::Answer stream = answer(request("GET", "/v1/events", cookie));
    auto& source = *std::get<std::unique_ptr<http::EventSource>>(stream);
    source.start([] {});
    EXPECT_FALSE(source.over());
    EXPECT_EQ(status("GET", "/v1/whoami", cookie), 200U);
    services_->withTrust([&](sqlite::Database& database) {
        return fleet::RevokedKeys(database).revokeOperator("ada", today());
    });
    EXPECT_EQ(status("GET", "/v1/whoami", cookie), 401U);
    EXPECT_EQ(status("GET", "/console/session", cookie), 401U);
    EXPECT_TRUE(eventually([&] { return source.over(); }));
}

TEST_F(CentresConsole, LetsABrowserRunOnlyItsOwnFiles) {
    std::string policy;
    for (const auto& [name, value] : console_->commonFields()) {
        if (name == "Content-Security-Policy") policy = value;
    }
    EXPECT_EQ(policy,
              "default-src 'none'; script-src 'self'; style-src 'self'; img-src 'self'; "
              "connect-src 'self'; base-uri 'none'; form-action 'none'; frame-ancestors 'none'");
}

TEST_F(CentreInterface, GivesNoLinkToAConsoleThatItDoesNotServe) {
    const auto answer = post("/v1/console-links", admin());
    EXPECT_EQ(answer.status, 404U);
    EXPECT_NE(answer.document.value("error", "").find("--console"), std::string::npos);
}

}  // namespace
