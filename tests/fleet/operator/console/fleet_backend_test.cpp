// ctest-label: threaded
// The console before a fleet: a centre whose answers the tests write, and a program that they
// write.
#include "fleet/operator/console/fleet_backend.h"

#include <gtest/gtest.h>

#include <chrono>
#include <csignal>
#include <memory>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "ctl/console/served_console.h"
#include "support/scratch_dir.h"
#include "tests/fleet/operator/certified.h"
#include "tests/fleet/operator/scripted_centre.h"

namespace {

using console_test::ServedConsole;
using nlohmann::json;
using operator_test::kHour;
using operator_test::ScriptedCentre;

json startOf(const std::string& product) {
    return {{"verb", "start"}, {"arguments", {product}}, {"options", {{"on", "env=test"}}}};
}

class FleetConsole : public testing::Test {
protected:
    FleetConsole() { centre_.answer("POST /v1/sessions", 200, {{"session", "s1"}}); }

    fleet::FleetBackend::Settings settings() const {
        fleet::FleetBackend::Settings settings{
            root_.certified({"START"}, {"ux"}, "*", now_ + kHour)};
        settings.identity.url = centre_.url();
        settings.identity.authority = authority_.certificate();
        settings.program = scratch_.path("program");
        return settings;
    }
    void serve(fleet::FleetBackend::Settings settings) {
        served_.emplace(std::make_unique<fleet::FleetBackend>(std::move(settings)));
        served_->open();
    }
    void serve() { serve(settings()); }

    /// What the operator's program does in place of its work.
    void program(const std::string& script) const { scratch_.script("program", script + "\n"); }
    RawClient::Answer get(const std::string& target) const {
        return served_->ask(served_->get(target, served_->cookie()));
    }
    RawClient::Answer run(const json& request) const {
        return served_->ask(served_->send("POST", "/console/run", request.dump()));
    }
    std::string read(const std::string& file) const {
        return scratch_.exists(file) ? scratch_.read(file) : "";
    }

    const ScratchDir scratch_;
    const operator_test::Root root_;
    const fleet::Moment now_ = fleet_test::wallTime();
    const fleet::CertificateAuthority authority_ =
        fleet::CertificateAuthority::make("demo", now_, now_ + kHour);
    ScriptedCentre centre_{authority_.issue({"centre.example", "127.0.0.1"}, now_, now_ + kHour)};
    std::optional<ServedConsole> served_;
};

TEST_F(FleetConsole, DescribesTheFleetAndItsOperator) {
    centre_.answer("GET /v1/whoami", 200, {{"operator", "mary"}, {"role", "admin"}});
    serve();
    const json document = json::parse(get("/console/session").body);
    EXPECT_EQ(document["mode"], "fleet");
    EXPECT_EQ(document["address"], centre_.url());
    EXPECT_EQ(document["fleet"], "demo");
    EXPECT_EQ(document["operator"], "mary");
    EXPECT_EQ(document["role"], "admin");
    EXPECT_EQ(document["command"], "zavctl --fleet " + centre_.url());
    EXPECT_EQ(document["program"], "zavctl-fleet");
    EXPECT_TRUE(document["version"].is_string());
    EXPECT_EQ(served_->ask(served_->send("POST", "/console/session", "{}")).status, 405);
}

TEST_F(FleetConsole, DescribesTheOperatorByTheCertificateWhileTheCentreIsAway) {
    fleet::FleetBackend::Settings viewer = settings();
    viewer.identity = root_.certified({}, {}, "*", now_ + kHour);
    viewer.identity.url = "https://127.0.0.1:1";
    viewer.identity.authority = authority_.certificate();
    serve(std::move(viewer));
    EXPECT_EQ(json::parse(get("/console/session").body)["role"], "viewer");
    const auto answer = get("/v1/hosts");
    EXPECT_EQ(answer.status, 502);
    EXPECT_NE(json::parse(answer.body).value("error", "").find("127.0.0.1:1"), std::string::npos);
}

TEST_F(FleetConsole, HandsReadsToTheCentreInOneSession) {
    centre_.answer("GET /v1/hosts?limit=5&selector=env%3Dtest", 200, {{"hosts", json::array()}});
    centre_.answer("GET /v1/rollouts/x", 403, {{"error", "not for you"}});
    serve();
    const auto answer = get("/v1/hosts?limit=5&selector=env%3Dtest");
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.body, R"({"hosts":[]})");
    EXPECT_NE(answer.head.find("Content-Type: application/json\r\n"), std::string::npos);
    EXPECT_EQ(get("/v1/rollouts/x").status, 403);
    EXPECT_EQ(get("/v1/rollouts/x").body, R"({"error":"not for you"})");
    EXPECT_EQ(get("/v1/nothing").status, 404);
    EXPECT_EQ(centre_.bodiesOf("POST /v1/sessions").size(), 1U);
    RawClient client = served_->connect();
    client.send("HEAD /v1/hosts?limit=5&selector=env%3Dtest HTTP/1.1\r\nHost: " + served_->host() +
                "\r\n" + served_->cookie() + "\r\n");
    EXPECT_EQ(client.readUntil("\r\n\r\n").substr(0, 12), "HTTP/1.1 200");
}

TEST_F(FleetConsole, SaysWhenToAskAgainAsTheCentreDoes) {
    const json busy = {{"error", "too much is under way"}};
    centre_.answer("GET /v1/hosts", 429, busy, "Retry-After: 7\r\n");
    centre_.answer("GET /v1/hosts", 429, busy, "Retry-After: <script>\r\n");
    serve();
    const auto answer = get("/v1/hosts");
    EXPECT_EQ(answer.status, 429);
    EXPECT_NE(answer.head.find("\r\nRetry-After: 7\r\n"), std::string::npos) << answer.head;
    EXPECT_EQ(get("/v1/hosts").head.find("Retry-After"), std::string::npos);
}

TEST_F(FleetConsole, TakesNoLongerAnswerThanACentreHasToGive) {
    centre_.answer("GET /v1/hosts", 200, {{"hosts", std::string(9 << 20, 'x')}});
    serve();
    const auto answer = get("/v1/hosts");
    EXPECT_EQ(answer.status, 502);
    EXPECT_NE(answer.body.find("more than it should"), std::string::npos) << answer.body;
}

TEST_F(FleetConsole, OpensAnotherSessionWhenOneHasEnded) {
    centre_.answer("GET /v1/hosts", 401, {{"error", "there is no such session"}});
    centre_.answer("GET /v1/hosts", 200, {{"hosts", json::array()}});
    serve();
    EXPECT_EQ(get("/v1/hosts").status, 200);
    EXPECT_EQ(centre_.bodiesOf("POST /v1/sessions").size(), 2U);
}

TEST_F(FleetConsole, DoesNotPassOffTheCentresRefusalAsItsOwn) {
    centre_.answer("GET /v1/hosts", 401, {{"error", "no"}});
    serve();
    EXPECT_EQ(get("/v1/hosts").status, 502);
}

TEST_F(FleetConsole, TellsWhyTheCentreGivesNoSession) {
    centre_.answer("GET /v1/hosts", 401, {{"error", "the session is over"}});
    centre_.answer("POST /v1/sessions", 403, {{"error", "this key was revoked"}});
    serve();
    const auto answer = get("/v1/hosts");
    EXPECT_EQ(answer.status, 409);
    EXPECT_NE(answer.body.find("this key was revoked"), std::string::npos) << answer.body;
}

TEST_F(FleetConsole, HandsNothingElseToTheCentre) {
    serve();
    for (const char* method : {"POST", "PUT", "DELETE", "PATCH"}) {
        const auto answer = served_->ask(served_->send(method, "/v1/rollouts/ID/pause", "{}"));
        EXPECT_EQ(answer.status, 405) << method;
        EXPECT_NE(answer.head.find("Allow: GET, HEAD\r\n"), std::string::npos) << answer.head;
    }
    EXPECT_EQ(served_->ask(served_->send("PUT", "/console/nothing", "x")).status, 404);
    EXPECT_TRUE(centre_.bodiesOf("POST /v1/sessions").empty());
}

TEST_F(FleetConsole, RunsTheOperatorsProgram) {
    program("for word; do echo \"$word\"; done >" + scratch_.path("words") +
            "\necho '{\"id\":\"r1\",\"hosts\":2}'; echo 'a note' >&2");
    serve();
    const auto answer = run(startOf("ux"));
    EXPECT_EQ(answer.status, 200) << answer.body;
    EXPECT_EQ(json::parse(answer.body),
              (json{{"exit", 0},
                    {"command", "zavctl --fleet " + centre_.url() + " start ux --on env=test"},
                    {"output", {{"id", "r1"}, {"hosts", 2}, {"rollout", "r1"}}},
                    {"messages", "a note\n"}}));
    EXPECT_EQ(read("words"), "--fleet=" + centre_.url() +
                                 "\n--json\n--timeout=110\nstart\n--on=env=test\n--no-wait\n"
                                 "--\nux\n");
}

TEST_F(FleetConsole, TellsHowTheProgramFailed) {
    program("echo 'no JSON'; echo 'zavctl: the host refused' >&2; exit 1");
    serve();
    const json document = json::parse(run(startOf("ux")).body);
    EXPECT_EQ(document["exit"], 1);
    EXPECT_EQ(document["output"], nullptr);
    EXPECT_EQ(document["messages"], "zavctl: the host refused\n");
    program("printf '\\377' >&2");
    EXPECT_TRUE(json::accept(run(startOf("ux")).body));
}

TEST_F(FleetConsole, GivesTheProgramItsInputAndItsHosts) {
    program("cat >" + scratch_.path("input") + "; cat /proc/self/fd/3 >" + scratch_.path("hosts"));
    serve();
    const json request = {{"verb", "config set"},
                          {"arguments", {"ux"}},
                          {"hosts", {"web-1", "web-2"}},
                          {"input", "A=1\nPASSWORD=x\n"}};
    EXPECT_EQ(run(request).status, 200);
    EXPECT_EQ(read("input"), "A=1\nPASSWORD=x\n");
    EXPECT_EQ(read("hosts"), "web-1\nweb-2\n");
}

TEST_F(FleetConsole, PushesAFileThatItHasReceived) {
    program("for word; do echo \"$word\"; done >" + scratch_.path("words") +
            "\ncat /proc/self/fd/3 >" + scratch_.path("file") + "\necho '{\"id\":\"r1\"}'");
    serve();
    const std::string file(300'000, 'x');
    const auto answer =
        served_->ask(served_->send("PUT", "/console/depot?path=ux/7.1/a%20b&on=env%3Dtest", file));
    EXPECT_EQ(answer.status, 200) << answer.body;
    const json document = json::parse(answer.body);
    EXPECT_EQ(document["output"]["rollout"], "r1");
    EXPECT_EQ(document["command"],
              "zavctl --fleet " + centre_.url() + " push FILE 'ux/7.1/a b' --on env=test");
    EXPECT_EQ(read("file"), file);
    EXPECT_EQ(read("words"), "--fleet=" + centre_.url() +
                                 "\n--json\n--timeout=590\npush\n--on=env=test\n--no-wait\n--\n"
                                 "/proc/self/fd/3\nux/7.1/a b\n");
}

TEST_F(FleetConsole, TakesNoFileWithoutAPlaceAndHosts) {
    program("touch " + scratch_.path("ran"));
    serve();
    for (const char* query : {"", "?path=a", "?on=*", "?path=&on=*", "?path=a&on=", "?path=a/&on=*",
                              "?path=a&path=b", "?path=a&on=@/etc/passwd", "?path=a&on=*&force=1",
                              "?path=%zz&on=*", "?path=a%0Ab&on=*"}) {
        const std::string target = std::string("/console/depot") + query;
        EXPECT_EQ(served_->ask(served_->send("PUT", target, "x")).status, 400) << query;
    }
    EXPECT_EQ(served_->ask(served_->send("POST", "/console/depot?path=a&on=*", "x")).status, 405);
    const std::string head =
        "PUT /console/depot?path=a&on=* HTTP/1.1\r\nHost: " + served_->host() + "\r\n";
    EXPECT_EQ(served_->ask(head + "X-Zav-Console: 1\r\nContent-Length: 1\r\n\r\nx").status, 401);
    EXPECT_EQ(served_
                  ->ask(head + "X-Zav-Console: 1\r\n" + served_->cookie() +
                        "Content-Length: 1073741825\r\n\r\n")
                  .status,
              413);
    EXPECT_FALSE(scratch_.exists("ran"));
}

TEST_F(FleetConsole, RunsNothingThatIsNotInItsTable) {
    program("touch " + scratch_.path("ran"));
    serve();
    for (const json& request :
         {json(), json{{"verb", "login"}}, json{{"verb", "start"}}, json{{"verb", "/bin/sh"}},
          json{{"verb", "start"}, {"arguments", {"ux"}}, {"options", {{"fleet", "x"}}}}}) {
        const auto answer = run(request);
        EXPECT_EQ(answer.status, 400) << request;
        EXPECT_NE(json::parse(answer.body).value("error", ""), "") << request;
    }
    EXPECT_EQ(get("/console/run").status, 405);
    EXPECT_FALSE(scratch_.exists("ran"));
}

TEST_F(FleetConsole, RunsNothingForStrangersAndOtherPages) {
    program("touch " + scratch_.path("ran"));
    serve();
    const std::string body = startOf("ux").dump();
    const std::string length = "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
    const std::string begin = "POST /console/run HTTP/1.1\r\nHost: " + served_->host() + "\r\n";
    const std::string own = "X-Zav-Console: 1\r\n";
    EXPECT_EQ(served_->ask(begin + own + length).status, 401);
    EXPECT_EQ(served_->ask(begin + served_->cookie() + length).status, 403);
    EXPECT_EQ(
        served_->ask(begin + own + served_->cookie() + "Origin: http://evil.example\r\n" + length)
            .status,
        403);
    EXPECT_EQ(served_
                  ->ask("POST /console/run HTTP/1.1\r\nHost: evil.example\r\n" + own +
                        served_->cookie() + length)
                  .status,
              403);
    EXPECT_FALSE(scratch_.exists("ran"));
    EXPECT_EQ(served_->ask(begin + own + served_->cookie() + length).status, 200);
    EXPECT_TRUE(scratch_.exists("ran"));
}

TEST_F(FleetConsole, EndsTheProgramWhenItsBrowserGoes) {
    program("echo $$ >" + scratch_.path("pid") + "; exec sleep 600");
    serve();
    {
        RawClient client = served_->connect();
        client.send(served_->send("POST", "/console/run", startOf("ux").dump()));
        ASSERT_TRUE(eventually([&] { return read("pid").find('\n') != std::string::npos; }));
    }
    const pid_t process = std::stoi(read("pid"));
    EXPECT_TRUE(eventually([&] { return ::kill(process, 0) != 0; }));
}

TEST_F(FleetConsole, EndsTheProgramWhenItEndsItself) {
    program("echo $$ >" + scratch_.path("pid") + "; exec sleep 600");
    serve();
    RawClient client = served_->connect();
    client.send(served_->send("POST", "/console/run", startOf("ux").dump()));
    ASSERT_TRUE(eventually([&] { return read("pid").find('\n') != std::string::npos; }));
    const pid_t process = std::stoi(read("pid"));
    served_.reset();
    EXPECT_NE(::kill(process, 0), 0);
}

TEST_F(FleetConsole, BoundsWhatAProgramMayTakeAndSay) {
    fleet::FleetBackend::Settings bounded = settings();
    bounded.runs.time = std::chrono::seconds(1);
    serve(std::move(bounded));
    program("exec sleep 600");
    EXPECT_EQ(run(startOf("ux")).status, 504);
    bounded = settings();
    bounded.runs.bytes = 100'000;
    serve(std::move(bounded));
    program("exec cat /dev/zero");
    EXPECT_EQ(run(startOf("ux")).status, 502);
}

TEST_F(FleetConsole, RunsAFewAtATime) {
    program("echo begun >>" + scratch_.path("begun") + "; while [ ! -e " + scratch_.path("go") +
            " ]; do sleep 0.05; done");
    serve();
    std::vector<RawClient> clients;
    for (int i = 0; i < 4; ++i) {
        clients.push_back(served_->connect());
        clients.back().send(served_->send("POST", "/console/run", startOf("ux").dump()));
    }
    ASSERT_TRUE(
        eventually([&] { return read("begun").size() == 4 * std::string("begun\n").size(); }));
    EXPECT_EQ(run(startOf("ux")).status, 429);
    scratch_.write("go", "");
    for (RawClient& client : clients)
        EXPECT_EQ(client.readAnswer().status, 200);
    EXPECT_EQ(run(startOf("ux")).status, 200);
}

TEST_F(FleetConsole, SaysThatItsProgramCannotBeRun) {
    serve();
    const auto answer = run(startOf("ux"));
    EXPECT_EQ(answer.status, 500);
    EXPECT_NE(json::parse(answer.body).value("error", ""), "");
}

}  // namespace
