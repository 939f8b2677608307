// ctest-label: threaded
// What the console answers over its port: to its own page, to strangers, and to hostile requests.
#include "ctl/console/console_server.h"

#include <gtest/gtest.h>

#include <unistd.h>

#include <atomic>
#include <chrono>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <utility>

#include "ctl/client/failure.h"
#include "ctl/console/browsers.h"
#include "ctl/console/secret.h"
#include "ctl/console/served_console.h"

namespace {

using console_test::ServedConsole;
using nlohmann::json;

constexpr const char* kNoHost = "/nowhere/zavhost.sock";

bool has(const RawClient::Answer& answer, const std::string& line) {
    return answer.head.find("\r\n" + line + "\r\n") != std::string::npos;
}

std::string errorIn(const RawClient::Answer& answer) {
    return json::parse(answer.body, nullptr, false).value("error", "");
}

void expectProtection(const RawClient::Answer& answer) {
    for (const char* line :
         {"Content-Security-Policy: default-src 'none'; script-src 'self'; style-src 'self'; "
          "img-src 'self'; connect-src 'self'; base-uri 'none'; form-action 'none'; "
          "frame-ancestors 'none'",
          "X-Content-Type-Options: nosniff", "Referrer-Policy: no-referrer",
          "Cross-Origin-Opener-Policy: same-origin", "Cross-Origin-Resource-Policy: same-origin"}) {
        EXPECT_TRUE(has(answer, line)) << line << "\n" << answer.head;
    }
    EXPECT_EQ(answer.head.find("Access-Control"), std::string::npos) << answer.head;
}

class TheConsole : public testing::Test {
protected:
    ServedConsole served{kNoHost};
};

TEST_F(TheConsole, IsOpenedByItsLinkOnce) {
    const auto answer = served.ask(served.get(served.opening()));
    EXPECT_EQ(answer.status, 303);
    EXPECT_TRUE(has(answer, "Location: /")) << answer.head;
    EXPECT_NE(answer.head.find("Set-Cookie: zav_console="), std::string::npos);
    EXPECT_NE(answer.head.find("; HttpOnly; SameSite=Strict; Path=/\r\n"), std::string::npos);
    EXPECT_TRUE(has(answer, "Cache-Control: no-store"));
    const auto again = served.ask(served.get(served.opening()));
    EXPECT_EQ(again.status, 403);
    EXPECT_TRUE(has(again, "Content-Type: text/html; charset=utf-8"));
    EXPECT_EQ(again.head.find("Set-Cookie"), std::string::npos);
}

/// Who the kernel would name for every connection.
class ABrowser : public testing::Test {
protected:
    static console::ConsoleSettings ownedBy(std::optional<uid_t> user) {
        console::ConsoleSettings settings = console_test::smallConsole();
        settings.browsers.ownerOf = [user](int) { return user; };
        return settings;
    }
    static unsigned statusOf(console::ConsoleSettings settings) {
        ServedConsole served(console_test::hostAt(kNoHost), std::move(settings));
        return static_cast<unsigned>(served.ask(served.get(served.opening())).status);
    }
};

TEST_F(ABrowser, OfTheConsolesOwnUserOrOfRootIsServed) {
    EXPECT_EQ(statusOf(ownedBy(::geteuid())), 303U);
    EXPECT_EQ(statusOf(ownedBy(0)), 303U);
}

TEST_F(ABrowser, OfAnybodyElseIsNotEvenWithTheLink) {
    EXPECT_EQ(statusOf(ownedBy(::geteuid() + 4711)), 403U);
    EXPECT_EQ(statusOf(ownedBy(std::nullopt)), 403U);
}

TEST_F(ABrowser, OfAnotherUserIsServedIfThatIsWanted) {
    console::ConsoleSettings settings = ownedBy(::geteuid() + 4711);
    settings.browsers.other = ::geteuid() + 4711;
    EXPECT_EQ(statusOf(settings), 303U);
    settings.browsers.other = ::geteuid() + 4712;
    EXPECT_EQ(statusOf(settings), 403U);
}

TEST(BrowserUsers, AreNamesAndNumbers) {
    EXPECT_EQ(console::browserUser("root"), 0U);
    EXPECT_EQ(console::browserUser("4711"), 4711U);
    for (const char* name : {"", "no-such-user", "-1", "4711x", "4294967295"})
        EXPECT_THROW(console::browserUser(name), ctl::Failure) << name;
}

TEST_F(TheConsole, IsNotOpenedByAnotherToken) {
    for (const std::string& target :
         {std::string("/open"), std::string("/open?token="), "/open?token=" + console::newSecret(),
          served.opening() + "&token=x", served.opening() + "0"}) {
        const auto answer = served.ask(served.get(target));
        EXPECT_EQ(answer.status, 403) << target;
        EXPECT_EQ(answer.body.find("token="), std::string::npos);
    }
    EXPECT_EQ(served.ask(served.get(served.opening())).status, 303) << "nobody has used it up";
}

TEST_F(TheConsole, IsNotOpenedByWhoeverOnlyLooksAtTheLink) {
    const std::string target = served.opening();
    RawClient looker = served.connect();
    looker.send("HEAD " + target + " HTTP/1.1\r\nHost: " + served.host() + "\r\n\r\n");
    EXPECT_EQ(looker.readUntil("\r\n\r\n").substr(0, 12), "HTTP/1.1 405");
    EXPECT_EQ(served.ask("GET " + target + " HTTP/1.1\r\nHost: evil.example\r\n\r\n").status, 403);
    EXPECT_EQ(served.ask(served.get(target)).status, 303);
}

TEST_F(TheConsole, TellsNothingToThoseWithoutItsCookie) {
    served.open();
    for (const char* target : {"/v1/health", "/v1", "/console/session", "/console/none"}) {
        const auto answer = served.ask(served.get(target));
        EXPECT_EQ(answer.status, 401) << target;
        EXPECT_NE(errorIn(answer), "") << target;
    }
    for (const char* target : {"/", "/app.js", "/tasks", "/none.png", "/v10", "/consoles"}) {
        const auto answer =
            served.ask(served.get(target, "Cookie: zav_console=" + console::newSecret() + "\r\n"));
        EXPECT_EQ(answer.status, 401) << target;
        EXPECT_EQ(answer.body.substr(0, 15), "<!doctype html>") << target;
        EXPECT_NE(answer.body.find("zavctl console"), std::string::npos) << target;
    }
}

TEST_F(TheConsole, ShowsItsPageToThoseWithItsCookie) {
    served.open();
    const auto page = served.ask(served.get("/tasks/7", served.cookie()));
    EXPECT_EQ(page.status, 200);
    EXPECT_EQ(page.body, "<!doctype html>");
    EXPECT_TRUE(has(page, "Cache-Control: no-cache"));
    EXPECT_EQ(served.ask(served.get("/none.js", served.cookie())).status, 404);
}

TEST_F(TheConsole, ProtectsEveryAnswer) {
    served.open();
    expectProtection(served.ask(served.get("/", served.cookie())));
    expectProtection(served.ask(served.get("/app.js", served.cookie())));
    expectProtection(served.ask(served.get("/console/session", served.cookie())));
    expectProtection(served.ask(served.get("/v1/health", served.cookie())));
    expectProtection(served.ask(served.get("/v1/health")));
    expectProtection(served.ask(served.get(served.opening())));
    expectProtection(served.ask("GET / HTTP/1.1\r\nHost: evil.example\r\n\r\n"));
    expectProtection(served.ask("nonsense\r\n\r\n"));
    expectProtection(served.ask(served.send("PUT", "/console/depot", "x")));
}

TEST_F(TheConsole, DescribesItself) {
    served.open();
    const auto answer = served.ask(served.get("/console/session", served.cookie()));
    const json document = json::parse(answer.body);
    EXPECT_EQ(document["mode"], "host");
    EXPECT_EQ(document["address"], kNoHost);
    EXPECT_EQ(document["program"], "zavctl-console");
    EXPECT_EQ(document["command"], json::array({"zavctl"}));
    EXPECT_TRUE(has(answer, "Cache-Control: no-store"));
}

TEST_F(TheConsole, KnowsNoNameButItsOwn) {
    served.open();
    // A name of somebody's that leads to this machine, as DNS rebinding makes it.
    const std::string request =
        "GET /v1/health HTTP/1.1\r\nHost: evil.example:" + std::to_string(served.port()) + "\r\n" +
        served.cookie() + "\r\n";
    EXPECT_EQ(served.ask(request).status, 403);
    EXPECT_EQ(served.ask("GET / HTTP/1.0\r\n" + served.cookie() + "\r\n").status, 403);
    EXPECT_EQ(served
                  .ask("GET http://evil.example/ HTTP/1.1\r\nHost: " + served.host() + "\r\n" +
                       served.cookie() + "\r\n")
                  .status,
              400);
    EXPECT_EQ(served
                  .ask("GET / HTTP/1.1\r\nHost: localhost:" + std::to_string(served.port()) +
                       "\r\n" + served.cookie() + "\r\n")
                  .status,
              200);
}

TEST_F(TheConsole, ChangesNothingForOtherPages) {
    served.open();
    const std::string begin =
        "POST /v1/tasks HTTP/1.1\r\nHost: " + served.host() + "\r\n" + served.cookie();
    const std::string end = "Content-Length: 2\r\n\r\n{}";
    EXPECT_EQ(served.ask(begin + end).status, 403);
    EXPECT_EQ(served.ask(begin + "Origin: " + served.origin() + "\r\n" + end).status, 403);
    EXPECT_EQ(
        served.ask(begin + "X-Zav-Console: 1\r\nOrigin: http://evil.example\r\n" + end).status,
        403);
    // What a browser asks before it sends a field of somebody's own.
    const auto preflight =
        served.ask("OPTIONS /v1/tasks HTTP/1.1\r\nHost: " + served.host() +
                   "\r\nOrigin: http://evil.example\r\nAccess-Control-Request-Method: POST\r\n"
                   "Access-Control-Request-Headers: X-Zav-Console\r\n\r\n");
    EXPECT_EQ(preflight.status, 403);
    EXPECT_EQ(preflight.head.find("Access-Control"), std::string::npos);
    EXPECT_EQ(served.ask(begin + "X-Zav-Console: 1\r\n" + end).status, 502) << "the host is away";
}

TEST_F(TheConsole, RefusesWhatCouldHideASecondRequest) {
    served.open();
    const std::string begin = "POST /v1/tasks HTTP/1.1\r\nHost: " + served.host() +
                              "\r\nX-Zav-Console: 1\r\n" + served.cookie();
    EXPECT_EQ(served.ask(begin + "Content-Length: 2\r\nTransfer-Encoding: chunked\r\n\r\n0\r\n\r\n")
                  .status,
              400);
    EXPECT_EQ(served.ask(begin + "Content-Length: 2\r\nContent-Length: 3\r\n\r\n{}").status, 400);
    EXPECT_EQ(served.ask(begin + "Host: evil.example\r\nContent-Length: 2\r\n\r\n{}").status, 400);
    EXPECT_EQ(served.ask(begin + "X-A: b\r\n c\r\nContent-Length: 2\r\n\r\n{}").status, 400);
    EXPECT_EQ(served.ask("GET /v1/a b HTTP/1.1\r\nHost: " + served.host() + "\r\n\r\n").status,
              400);
}

TEST_F(TheConsole, SaysThatTheHostIsAway) {
    served.open();
    const auto answer = served.ask(served.get("/v1/health", served.cookie()));
    EXPECT_EQ(answer.status, 502);
    EXPECT_NE(errorIn(answer).find(kNoHost), std::string::npos) << answer.body;
}

TEST_F(TheConsole, RefusesAFileFromStrangersBeforeItIsRead) {
    served.open();
    const std::string large = "Content-Length: 1000000000\r\n\r\n";
    const std::string begin =
        "PUT /console/depot?path=a HTTP/1.1\r\nHost: " + served.host() + "\r\n";
    EXPECT_EQ(served.ask(begin + "X-Zav-Console: 1\r\n" + large).status, 401);
    EXPECT_EQ(served.ask(begin + served.cookie() + large).status, 403);
}

TEST_F(TheConsole, TakesFilesWithANameAndABoundedLengthOnly) {
    served.open();
    for (const char* query :
         {"", "?path=", "?path=a%5Cb", "?path=a/", "?path=a&path=b", "?name=a", "?path=%zz"}) {
        EXPECT_EQ(served.ask(served.send("PUT", std::string("/console/depot") + query, "x")).status,
                  400)
            << query;
    }
    const std::string begin = "PUT /console/depot?path=a HTTP/1.1\r\nHost: " + served.host() +
                              "\r\nX-Zav-Console: 1\r\n" + served.cookie();
    EXPECT_EQ(served.ask(begin + "Content-Length: 1073741825\r\n\r\n").status, 413);
    EXPECT_EQ(served.ask(begin + "\r\n").status, 411);
    EXPECT_EQ(served.ask(served.send("POST", "/console/depot?path=a", "x")).status, 405);
    EXPECT_EQ(served.ask(served.send("PUT", "/console/depot?path=a", "x")).status, 502);
}

TEST_F(TheConsole, TakesTheSameFileOnceAtATime) {
    served.open();
    const std::string begin = "PUT /console/depot?path=a HTTP/1.1\r\nHost: " + served.host() +
                              "\r\nX-Zav-Console: 1\r\n" + served.cookie() +
                              "Content-Length: 3\r\nExpect: 100-continue\r\n\r\n";
    RawClient first = served.connect();
    first.send(begin);
    EXPECT_EQ(first.readUntil("\r\n\r\n").substr(0, 12), "HTTP/1.1 100");
    EXPECT_EQ(served.ask(begin).status, 429);
    first.send("abc");
    EXPECT_EQ(first.readAnswer().status, 502);
    EXPECT_EQ(served.ask(served.send("PUT", "/console/depot?path=a", "x")).status, 502);
}

TEST(AConsole, SaysThatThereIsNoRoomForAFile) {
    console::HostSettings settings = console_test::hostAt(kNoHost);
    settings.uploadDirectory = "/nowhere";
    ServedConsole served(std::move(settings));
    served.open();
    const auto answer = served.ask(served.send("PUT", "/console/depot?path=a", "x"));
    EXPECT_EQ(answer.status, 507);
    EXPECT_NE(errorIn(answer).find("/nowhere"), std::string::npos);
}

TEST(AConsole, EndsItsSessionAfterHalfADay) {
    std::atomic<int> hours{1};
    console::ConsoleSettings settings = console_test::smallConsole();
    settings.clock = [&hours] { return std::chrono::hours(hours); };
    ServedConsole served(console_test::hostAt(kNoHost), std::move(settings));
    served.open();
    EXPECT_EQ(served.ask(served.get("/", served.cookie())).status, 200);
    hours = 13;
    EXPECT_EQ(served.ask(served.get("/", served.cookie())).status, 401);
    EXPECT_EQ(served.ask(served.get(served.opening())).status, 403);
}

TEST(AConsole, DoesNotTakeAPortThatSomebodyHas) {
    const ServedConsole served(kNoHost);
    console::HostBackend backend(console_test::hostAt(kNoHost));
    EXPECT_THROW(console::ConsoleServer(console_test::smallConsole(), backend, served.port()),
                 ctl::Failure);
}

}  // namespace
