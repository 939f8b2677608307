// ctest-label: threaded
// The centre's interface with a real centre behind it, without its connections.
#include "fleet/server/api/centre_api.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <set>
#include <string>
#include <vector>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/enrolment.h"
#include "fleet/bus/messages/login.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/trust/checksum.h"
#include "fleet/server/api/routes.h"
#include "fleet/server/keys/trust/host_enrolment.h"
#include "fleet/server/keys/trust/revocations.h"
#include "tests/fleet/server/api/centre_interface.h"
#include "tests/fleet/server/keys/running_fleet.h"

namespace {

using centre_interface::Answered;
using centre_interface::CentreInterface;
using centre_interface::LoggedIn;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::Moment;
using fleet::Role;
using made_fleet::today;
using nlohmann::json;

TEST_F(CentreInterface, TellsAnybodyWhetherItWorks) {
    const Answered answer = ask("GET", "/v1/health");
    EXPECT_EQ(answer.status, 200U);
    EXPECT_EQ(answer.document["program"], "zavfleetd");
    EXPECT_EQ(answer.document["fleet"], "demo");
    EXPECT_EQ(answer.document["state"], "working");
}

/// A route's path with all parameters that it needs.
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

TEST_F(CentreInterface, AnswersNothingElseWithoutASession) {
    for (const fleet::ApiRoute& route : fleet::apiRoutes()) {
        if (route.access == http::Access::None) continue;
        const std::string target = targetOf(route);
        EXPECT_EQ(ask(route.method, target).status, 401U) << target;
        EXPECT_EQ(ask(route.method, target, "no session").status, 401U) << target;
    }
}

TEST_F(CentreInterface, OpensSessionsForCertifiedKeysOnly) {
    const KeyPair stranger = KeyPair::make(KeyKind::User);
    EXPECT_EQ(ask("POST", "/v1/sessions", "", sessionRequest(stranger)).status, 403U);
    EXPECT_EQ(ask("POST", "/v1/sessions", "", "nonsense").status, 400U);
    const LoggedIn ada = admin();
    const std::string request = signSessionRequest(
        {"demo", ada.key.publicKey(), "https://elsewhere", today(), fleet::makeOrderId()}, ada.key);
    EXPECT_EQ(ask("POST", "/v1/sessions", "", request).status, 403U);
    const std::string once = sessionRequest(ada.key);
    EXPECT_EQ(ask("POST", "/v1/sessions", "", once).status, 200U);
    EXPECT_EQ(ask("POST", "/v1/sessions", "", once).status, 403U);
}

TEST_F(CentreInterface, TellsAnOperatorWhoHeIs) {
    const LoggedIn otto =
        login({"otto", Role::Operator, {"START"}, {"ux"}, "env=test", made_fleet::kDay});
    const Answered answer = get("/v1/whoami", otto);
    EXPECT_EQ(answer.status, 200U);
    EXPECT_EQ(answer.document, (json{{"operator", "otto"},
                                     {"key", otto.key.publicKey()},
                                     {"role", "operator"},
                                     {"commands", {"START"}},
                                     {"products", {"ux"}},
                                     {"selector", "env=test"},
                                     {"fleet", "demo"}}));
}

TEST_F(CentreInterface, EndsTheSessionsOfAKeyThatIsRevoked) {
    const LoggedIn ada = admin();
    EXPECT_EQ(get("/v1/hosts", ada).status, 200U);
    services_->withTrust([&](sqlite::Database& database) {
        return fleet::RevokedKeys(database).revokeOperator("ada", today());
    });
    EXPECT_EQ(get("/v1/hosts", ada).status, 401U);
    EXPECT_EQ(ask("POST", "/v1/sessions", "", sessionRequest(ada.key)).status, 403U);
}

TEST_F(CentreInterface, LetsNobodyJoinWithoutAnInvitation) {
    const KeyPair bus = KeyPair::make(KeyKind::User);
    const KeyPair signing = KeyPair::make(KeyKind::User);
    const std::string request = signEnrolment(
        {"demo", "A123456789012345678901", bus.publicKey(), signing.publicKey(), "machine"}, bus,
        signing);
    EXPECT_EQ(ask("POST", "/v1/enrolments", "", request).status, 403U);
    EXPECT_EQ(ask("POST", "/v1/enrolments", "", "").status, 400U);
    EXPECT_EQ(ask("POST", "/v1/logins", "", "{}").status, 400U);
}

TEST_F(CentreInterface, ListsTheHostsThatHaveJoined) {
    const LoggedIn ada = admin();
    const std::string web = join("web-1", {{"env", "test"}});
    const std::string db = join("db-1", {{"env", "prod"}});
    const Answered all = get("/v1/hosts", ada);
    ASSERT_EQ(all.document["hosts"].size(), 2U);
    const Answered some = get("/v1/hosts?selector=env%3Dtest", ada);
    ASSERT_EQ(some.document["hosts"].size(), 1U);
    const json& host = some.document["hosts"][0];
    EXPECT_EQ(host["host"], web);
    EXPECT_EQ(host["name"], "web-1");
    EXPECT_EQ(host["labels"], (json{{"env", "test"}}));
    EXPECT_EQ(host["state"], "unknown") << "it was never heard";
    EXPECT_EQ(get("/v1/hosts/db-1", ada).document["host"], db);
    EXPECT_EQ(get("/v1/hosts/" + db, ada).document["name"], "db-1");
    EXPECT_EQ(get("/v1/hosts/nobody", ada).status, 404U);
    EXPECT_EQ(get("/v1/hosts?selector=%3D", ada).status, 400U);
}

TEST_F(CentreInterface, ListsHostsInPages) {
    const LoggedIn ada = admin();
    std::set<std::string> joined, listed;
    for (int i = 0; i < 5; ++i)
        joined.insert(join("web-" + std::to_string(i)));
    std::string after;
    for (int page = 0; page < 3; ++page) {
        const Answered answer = get("/v1/hosts?limit=2&after=" + after, ada);
        for (const json& host : answer.document["hosts"])
            listed.insert(host["host"].get<std::string>());
        EXPECT_EQ(answer.document.contains("next"), page < 2);
        after = answer.document.value("next", "");
    }
    EXPECT_EQ(listed, joined);
}

TEST_F(CentreInterface, ShowsAViewerOnlyTheirHosts) {
    join("web-1", {{"env", "test"}});
    join("db-1", {{"env", "prod"}});
    const LoggedIn vera = login({"vera", Role::Viewer, {}, {}, "env=test", made_fleet::kDay});
    const Answered hosts = get("/v1/hosts", vera);
    ASSERT_EQ(hosts.document["hosts"].size(), 1U);
    EXPECT_EQ(hosts.document["hosts"][0]["name"], "web-1");
    EXPECT_EQ(get("/v1/hosts/db-1", vera).status, 404U);
    EXPECT_EQ(get("/v1/hosts/db-1/orders", vera).status, 404U);
}

TEST_F(CentreInterface, LetsAViewerChangeNothing) {
    const LoggedIn vera = login({"vera", Role::Viewer, {}, {}, "*", made_fleet::kDay});
    for (const fleet::ApiRoute& route : fleet::apiRoutes()) {
        if (route.access != http::Access::Act) continue;
        EXPECT_EQ(ask(route.method, targetOf(route), vera.session, "{}").status, 403U)
            << route.path;
    }
}

TEST_F(CentreInterface, LetsAdminsLabelHosts) {
    const LoggedIn ada = admin();
    const LoggedIn otto = login({"otto", Role::Operator, {"START"}, {"ux"}, "*", made_fleet::kDay});
    join("web-1", {{"env", "test"}});
    const json labels = {{"labels", {{"env", "prod"}, {"rack", "7"}}}};
    EXPECT_EQ(post("/v1/hosts/web-1/labels", otto, labels).status, 403U);
    EXPECT_EQ(post("/v1/hosts/web-1/labels", ada, labels).document["labels"], labels["labels"]);
    EXPECT_EQ(get("/v1/hosts?selector=rack%3D7", ada).document["hosts"].size(), 1U);
    for (const json& bad : {json{{"a b", "x"}}, json{{"a", 7}}, json{{"a", "x,b=y"}}}) {
        EXPECT_EQ(post("/v1/hosts/web-1/labels", ada, {{"labels", bad}}).status, 400U) << bad;
    }
    EXPECT_EQ(get("/v1/hosts/web-1", ada).document["labels"], labels["labels"]);
}

TEST_F(CentreInterface, LetsAnAdminRetireAHost) {
    const LoggedIn ada = admin();
    const LoggedIn otto = login({"otto", Role::Operator, {"START"}, {"ux"}, "*", made_fleet::kDay});
    const std::string host = join("web-1");
    post("/v1/rollouts", ada, {{"orders", {orderFor(host, ada)}}});
    ASSERT_TRUE(eventually(
        [&] { return get("/v1/hosts/web-1/orders", ada).document["orders"].size() == 1; }));
    EXPECT_EQ(post("/v1/hosts/web-1/retire", otto).status, 403U);
    EXPECT_EQ(post("/v1/hosts/web-1/retire", ada).document["unknown"], 1);
    EXPECT_EQ(get("/v1/hosts/web-1", ada).status, 404U);
    const std::string path =
        "/v1/rollouts/" + get("/v1/rollouts", ada).document["rollouts"][0]["id"].get<std::string>();
    EXPECT_TRUE(eventually([&] { return get(path, ada).document["state"] != "running"; }));
    EXPECT_EQ(get(path, ada).document["counts"]["over"], (json{{"unknown", 1}}));
    EXPECT_EQ(ask("POST", "/v1/sessions", "", sessionRequest(signers_.at("web-1"))).status, 403U);
}

TEST_F(CentreInterface, EndsARollOutWhoseHostsWereRetiredBeforeTheirTurn) {
    const LoggedIn ada = admin();
    const std::string one = join("web-1");
    const std::string other = join("web-2");
    const std::string id =
        post("/v1/rollouts", ada,
             {{"waves", "1,100%"}, {"orders", {orderFor(one, ada), orderFor(other, ada)}}})
            .document["id"];
    const std::string path = "/v1/rollouts/" + id;
    ASSERT_TRUE(eventually([&] { return get(path, ada).document["counts"]["released"] == 1; }));
    EXPECT_EQ(post("/v1/hosts/web-2/retire", ada).document["unknown"], 0);
    EXPECT_EQ(post("/v1/hosts/web-1/retire", ada).document["unknown"], 1);
    // What nobody knows counts as a failure, and the plan allows none.
    ASSERT_TRUE(eventually([&] { return get(path, ada).document["state"] == "paused"; }));
    EXPECT_EQ(post(path + "/resume", ada, json::object()).status, 200U);
    EXPECT_TRUE(eventually([&] { return get(path, ada).document["state"] == "finished"; }));
    EXPECT_EQ(get(path, ada).document["counts"]["over"], (json{{"cancelled", 1}, {"unknown", 1}}));
}

TEST_F(CentreInterface, MakesARollOutOfOrders) {
    const LoggedIn ada = admin();
    const std::string one = join("web-1");
    const std::string other = join("web-2");
    const std::string order = fleet::makeOrderId();
    const Answered made = post("/v1/rollouts", ada,
                               {{"waves", "1,100%"},
                                {"maxFailures", "1"},
                                {"pause", 0.5},
                                {"orders", {orderFor(one, ada, order), orderFor(other, ada)}}});
    ASSERT_EQ(made.status, 201U) << made.document;
    EXPECT_EQ(made.document["kind"], "START");
    EXPECT_EQ(made.document["product"], "ux");
    EXPECT_EQ(made.document["operator"], "ada");
    EXPECT_EQ(made.document["hosts"], 2);
    EXPECT_EQ(made.document["plan"]["pause"], 0.5);
    const std::string path = "/v1/rollouts/" + made.document["id"].get<std::string>();
    // The first wave is released with the next look, and its host is never heard of.
    EXPECT_TRUE(eventually([&] { return get(path, ada).document["counts"]["released"] == 1; }));
    const json parts = get(path + "/hosts", ada).document["hosts"];
    ASSERT_EQ(parts.size(), 2U);
    EXPECT_EQ(parts[0]["name"], "web-1");
    EXPECT_EQ(parts[0]["state"], "released");
    EXPECT_EQ(parts[0]["order"], order);
    EXPECT_EQ(parts[1]["state"], "waiting");
    EXPECT_EQ(get("/v1/rollouts", ada).document["rollouts"][0]["id"], made.document["id"]);
    const json given = get("/v1/hosts/web-1/orders", ada).document["orders"];
    ASSERT_EQ(given.size(), 1U);
    EXPECT_EQ(given[0]["order"], order);
    EXPECT_EQ(given[0]["kind"], "START");
    EXPECT_EQ(given[0]["product"], "ux");
    EXPECT_EQ(given[0]["operator"], "ada");
    EXPECT_EQ(given[0]["state"], "open");
    EXPECT_EQ(get("/v1/orders/" + order, ada).document, given[0]);
    EXPECT_EQ(get("/v1/orders/" + fleet::makeOrderId(), ada).status, 404U);
    EXPECT_EQ(get("/v1/orders/none", ada).status, 400U);
    const LoggedIn vera = login({"vera", Role::Viewer, {}, {}, "env=test", made_fleet::kDay});
    EXPECT_EQ(get("/v1/orders/" + order, vera).status, 404U) << "it is another host's";
}

TEST_F(CentreInterface, TakesOrdersInABatch) {
    const LoggedIn ada = admin();
    const std::string batch = post("/v1/batches", ada).document["batch"];
    const std::string path = "/v1/batches/" + batch + "/orders";
    EXPECT_EQ(post(path, ada, {{"orders", {orderFor(join("web-1"), ada)}}}).document["orders"], 1);
    EXPECT_EQ(post(path, ada, {{"orders", {orderFor(join("web-2"), ada)}}}).document["orders"], 2);
    EXPECT_EQ(post(path, ada, {{"orders", {"@"}}}).status, 400U);
    EXPECT_EQ(post(path, ada, {{"orders", {7}}}).status, 400U);
    EXPECT_EQ(post("/v1/rollouts", ada, {{"batch", batch}, {"orders", json::array()}}).status,
              400U);
    EXPECT_EQ(post("/v1/rollouts", ada, {{"batch", batch}}).document["hosts"], 2);
    EXPECT_EQ(post("/v1/rollouts", ada, {{"batch", batch}}).status, 404U) << "it was taken";
}

TEST_F(CentreInterface, RefusesRollOutsThatCannotBe) {
    const LoggedIn ada = admin();
    const LoggedIn otto = login({"otto", Role::Operator, {"START"}, {"ux"}, "*", made_fleet::kDay});
    const std::string host = join("web-1");
    const json orders = {orderFor(host, ada)};
    EXPECT_EQ(post("/v1/rollouts", ada, json::object()).status, 400U);
    EXPECT_EQ(post("/v1/rollouts", ada, {{"orders", {"AAAA"}}}).status, 400U);
    EXPECT_EQ(post("/v1/rollouts", otto, {{"orders", orders}}).status, 400U)
        << "signed by somebody else";
    for (const json& bad : {json{{"waves", "0"}}, json{{"maxFailures", "x"}}, json{{"pause", -1}},
                            json{{"pause", 1e300}}, json{{"parallel", 0}}, json{{"parallel", -1}},
                            json{{"parallel", 1.5}}, json{{"id", "x"}}, json{{"wait", 0}}}) {
        json body = bad;
        body["orders"] = orders;
        EXPECT_EQ(post("/v1/rollouts", ada, body).status, 400U) << bad;
    }
    EXPECT_EQ(get("/v1/rollouts", ada).document["rollouts"].size(), 0U);
    EXPECT_EQ(get("/v1/rollouts/nothing", ada).status, 404U);
}

TEST_F(CentreInterface, PausesResumesAndAbortsRollOuts) {
    const LoggedIn ada = admin();
    const LoggedIn otto = login({"otto", Role::Operator, {"START"}, {"ux"}, "*", made_fleet::kDay});
    const std::string host = join("web-1");
    const std::string order = fleet::makeOrderId();
    const std::string id =
        post("/v1/rollouts", ada, {{"orders", {orderFor(host, ada, order)}}}).document["id"];
    const std::string path = "/v1/rollouts/" + id;
    EXPECT_EQ(post(path + "/pause", otto).status, 403U) << "it is somebody else's";
    EXPECT_EQ(get(path + "/to-sign?for=abort", otto).status, 403U);
    EXPECT_EQ(post(path + "/pause", ada).document["state"], "paused");
    EXPECT_EQ(post(path + "/pause", ada).status, 409U);
    EXPECT_EQ(post(path + "/resume", ada, json::object()).document["state"], "running");
    EXPECT_TRUE(eventually([&] { return get(path, ada).document["counts"]["released"] == 1; }));
    EXPECT_EQ(post(path + "/abort", ada, json::object()).document["state"], "aborted");
    const json toSign = get(path + "/to-sign?for=abort", ada).document;
    EXPECT_EQ(toSign["total"], 1);
    ASSERT_EQ(toSign["hosts"].size(), 1U);
    EXPECT_EQ(toSign["hosts"][0]["host"], host);
    EXPECT_EQ(toSign["hosts"][0]["order"], order);
    const std::string bytes = fleet::bytesOfBase64(toSign["hosts"][0]["signed"].get<std::string>());
    EXPECT_EQ(fleet::readOrder(bytes).order.id, order);
    EXPECT_TRUE(isSignedByOperator(fleet::readOrder(bytes), ada.key.publicKey()));
    EXPECT_EQ(get(path + "/to-sign?for=nothing", ada).status, 400U);
    EXPECT_EQ(get(path + "/failures", ada).document["hosts"].size(), 0U);
}

TEST_F(CentreInterface, GivesAFileToTheHostWhoseOrderNeedsIt) {
    const LoggedIn ada = admin();
    const std::string web = join("web-1");
    join("web-2");
    fleet::Checksum sum;
    sum.add("package");
    const std::string path = "/v1/files/" + sum.hex();
    const std::vector<fleet::OrderFile> files = {{"ux.tar", path.substr(10), 7}};
    const json orders = {orderFor(web, ada, fleet::makeOrderId(), files)};
    EXPECT_EQ(post("/v1/rollouts", ada, {{"orders", orders}}).status, 400U) << "it is not here";
    EXPECT_EQ(get(path + "?size=7", ada).status, 404U);
    EXPECT_EQ(ask("POST", path + "?size=7&from=0", ada.session, "pack").document["have"], 4);
    EXPECT_EQ(get(path + "?size=7", ada).document["complete"], false);
    EXPECT_EQ(ask("POST", path + "?size=7&from=4", ada.session, "age").document["complete"], true);

    const auto sessionOf = [&](const std::string& host) {
        return ask("POST", "/v1/sessions", "", sessionRequest(signers_.at(host)))
            .document.value("session", "");
    };
    const auto fetch = [&](const std::string& session, const std::string& range) {
        http::Request request{"GET", path + "/content", "", {0, 0, 0, http::Access::Act}};
        request.authorization = "Bearer " + session;
        request.range = range;
        auto handled = api_->handle(std::move(request));
        handled = std::get<http::Job>(handled)();
        return std::get<http::Reply>(std::get<http::Answer>(handled));
    };
    const std::string host = sessionOf("web-1");
    EXPECT_EQ(fetch(host, "").status, 403U) << "no order of it needs the file yet";
    const json made = post("/v1/rollouts", ada, {{"orders", orders}}).document;
    ASSERT_TRUE(eventually([&] { return fetch(host, "").status == 206; })) << made;
    EXPECT_EQ(fetch(host, "").body, "package");
    const http::Reply piece = fetch(host, "bytes=2-3");
    EXPECT_EQ(piece.body, "ck");
    EXPECT_EQ(piece.fields.at(0).second, "bytes 2-3/7");
    EXPECT_EQ(fetch(host, "bytes=5-").body, "ge");
    EXPECT_EQ(fetch(host, "bytes=7-").status, 416U);
    EXPECT_EQ(fetch(host, "bytes=-3").body, "package");
    EXPECT_EQ(fetch(host, "bytes=99999999999999999999-").body, "package");
    EXPECT_EQ(fetch(sessionOf("web-2"), "").status, 403U);
    EXPECT_EQ(fetch(ada.session, "").status, 401U);
    EXPECT_EQ(get("/v1/hosts", {signers_.at("web-1"), "", host}).status, 401U)
        << "a host is no operator";
}

TEST_F(CentreInterface, TakesNoFileThatIsNotWhatItWasSaidToBe) {
    const LoggedIn ada = admin();
    const std::string path = "/v1/files/" + std::string(64, 'a');
    EXPECT_EQ(ask("POST", path + "?size=1&from=0", ada.session, "x").status, 400U);
    EXPECT_EQ(ask("POST", path + "?size=1", ada.session, "x").status, 400U);
    EXPECT_EQ(ask("POST", "/v1/files/x?size=1&from=0", ada.session, "x").status, 400U);
    EXPECT_EQ(ask("POST", path + "?size=999999999999999&from=0", ada.session, "x").status, 507U);
}

TEST_F(CentreInterface, SaysWhenItCannotDoAnythingNow) {
    const LoggedIn ada = admin();
    service_->end();
    eventually([this] { return !service_->centre().isWorking(); });
    EXPECT_EQ(ask("GET", "/v1/health").document["state"], "waiting");
    EXPECT_EQ(get("/v1/rollouts", ada).status, 503U);
    EXPECT_EQ(get("/v1/whoami", ada).status, 200U);
}

}  // namespace
