// ctest-label: threaded
// The description of the centre's interface against what a centre really answers.
#include <gtest/gtest.h>

#include <memory>
#include <nlohmann/json.hpp>
#include <set>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "fleet/bus/messages/facts.h"
#include "fleet/bus/messages/question.h"
#include "fleet/bus/nats/store.h"
#include "fleet/bus/nats/streams.h"
#include "fleet/bus/trust/checksum.h"
#include "fleet/server/api/openapi.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"
#include "tests/fleet/server/api/centre_interface.h"

namespace {

using centre_interface::CentreInterface;
using centre_interface::LoggedIn;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::OperatorGrant;
using fleet::Role;
using made_fleet::kPatience;
using made_fleet::today;
using nlohmann::json;

class DescribedCentre : public CentreInterface {
protected:
    DescribedCentre() : CentreInterface(true) {}

    /// What is asked: the path as the description has it, and what stands in the place of its
    /// parameter, with the query.
    struct Asked {
        std::string method;
        std::string path;
        std::string value = "";
        std::string query = "";

        std::string target() const {
            const std::size_t begin = path.find('{');
            if (begin == std::string::npos) return path + query;
            const std::size_t end = path.find('}') + 1;
            return path.substr(0, begin) + value + path.substr(end) + query;
        }
    };

    /// Asks and notes the answer. Returns the document, or null if it is not one.
    json expect(unsigned status, const Asked& asked, const std::string& session = "",
                const std::string& body = "") {
        http::Request request{asked.method, asked.target(), body, {0, 0, 0, http::Access::Act}};
        if (!session.empty()) request.authorization = "Bearer " + session;
        auto handled = api_->handle(std::move(request));
        if (auto* const job = std::get_if<http::Job>(&handled)) handled = (*job)();
        const auto& reply = std::get<http::Reply>(std::get<http::Answer>(handled));
        EXPECT_EQ(reply.status, status) << asked.target() << ": " << reply.body;
        json fields = {{"Content-Type", reply.type}};
        for (const auto& [name, value] : reply.fields)
            fields[name] = value;
        answers_.push_back({{"method", asked.method},
                            {"path", asked.path},
                            {"target", asked.target()},
                            {"status", reply.status},
                            {"fields", fields},
                            {"text", reply.body}});
        return json::parse(reply.body, nullptr, false);
    }
    json expect(unsigned status, const Asked& asked, const LoggedIn& who, const json& body = {}) {
        return expect(status, asked, who.session, body.is_null() ? "" : body.dump());
    }

    /// Facts with everything in them, as the host's link tells them.
    void tellFacts(const std::string& name) {
        const KeyPair& bus = buses_.at(name);
        fleet::Facts facts;
        facts.host = bus.publicKey();
        facts.time = today();
        facts.name = name;
        facts.labels = {{"env", "test"}};
        facts.link = "1.0";
        facts.version = "1.1";
        facts.journal = "j1";
        facts.inventory = fleet::Inventory{today(), json{{"products", {{{"PRODUCT", "ux"}}}},
                                                         {"instances", {{{"product", "ux"}}}},
                                                         {"warnings", {"it is slow"}},
                                                         {"leftOut", 3}}
                                                        .dump()};
        const auto host = fleet_->connect(bus, fleet_->hostToken(bus));
        ASSERT_TRUE(host.connection) << host.text;
        const auto kept = fleet::store(*host.connection, fleet::kFactsSubject + bus.publicKey(),
                                       signFacts(facts, signers_.at(name)), kPatience);
        ASSERT_EQ(kept.kind, fleet::StoreResult::Kind::Stored) << kept.text;
        ASSERT_TRUE(eventually([&] {
            return ask("GET", "/v1/hosts/" + name, ada_.session).document.contains("facts");
        }));
    }
    /// The host tells how an order ended.
    void tellOutcome(const std::string& host, fleet::Number number, const std::string& order,
                     const std::string& state) {
        services_->ask([&](fleet::CentreDesk& desk) {
            desk.parts.centre.hear({host, number, order, "j1", state, R"({"reason":"so it is"})"});
            return true;
        });
    }
    bool isInState(const std::string& rollout, const std::string& state) {
        return eventually([&] {
            return ask("GET", "/v1/rollouts/" + rollout, ada_.session).document["state"] == state;
        });
    }

    void askPeople();
    void askHosts();
    void askQuestions();
    void bringFiles();
    void rollOut();
    void readEvents(http::EventSource& source);
    void judge();

    LoggedIn ada_;
    std::string web_;
    std::vector<json> answers_;
};

void DescribedCentre::askPeople() {
    expect(200, {"GET", "/v1/health"});
    expect(200, {"GET", "/v1/openapi.json"});
    expect(401, {"GET", "/v1/whoami"});
    expect(200, {"GET", "/v1/whoami"}, ada_);
    expect(201, {"POST", "/v1/console-links"}, ada_);
    expect(200, {"POST", "/v1/sessions"}, "", sessionRequest(ada_.key));
    expect(200, {"POST", "/v1/sessions"}, "", sessionRequest(signers_.at("web-1")));
    expect(403, {"POST", "/v1/sessions"}, "", sessionRequest(KeyPair::make(KeyKind::User)));
    expect(400, {"POST", "/v1/logins"}, "", "nonsense");

    const KeyPair key = KeyPair::make(KeyKind::User);
    const OperatorGrant grant{"otto", Role::Operator, {"START"}, {"ux"}, "*", made_fleet::kDay};
    const std::string token = services_->withTrust([&](sqlite::Database& database) {
        return fleet::Operators(database).invite(grant, made_fleet::kDay, today());
    });
    const std::string login = signLogin({"demo", token, key.publicKey()}, key);
    expect(200, {"POST", "/v1/logins"}, "", login);
    services_->withTrust([&](sqlite::Database& database) {
        fleet::Operators(database).certify({key.publicKey()}, fleet_->made().root(), today());
        return 0;
    });
    expect(200, {"POST", "/v1/logins"}, "", login);

    const KeyPair bus = KeyPair::make(KeyKind::User);
    const KeyPair signing = KeyPair::make(KeyKind::User);
    const std::string invitation = services_->withTrust([](sqlite::Database& database) {
        return fleet::HostEnrolment(database).invite({"web-9", {}}, today());
    });
    expect(200, {"POST", "/v1/enrolments"}, "",
           signEnrolment({"demo", invitation, bus.publicKey(), signing.publicKey(), "machine"}, bus,
                         signing));
    expect(400, {"POST", "/v1/enrolments"}, "", "");
}

void DescribedCentre::askHosts() {
    expect(200, {"GET", "/v1/hosts/{host}", "web-1"}, ada_);
    sayHello("web-1");
    tellFacts("web-1");
    expect(200, {"GET", "/v1/hosts/{host}", "web-1"}, ada_);
    expect(404, {"GET", "/v1/hosts/{host}", "nobody"}, ada_);
    expect(200, {"GET", "/v1/hosts", "", "?limit=1"}, ada_);
    expect(400, {"GET", "/v1/hosts", "", "?selector=%3D"}, ada_);
    expect(200, {"GET", "/v1/inventory", "", "?limit=1"}, ada_);
    expect(200, {"POST", "/v1/hosts/{host}/labels", "web-1"}, ada_,
           {{"labels", {{"env", "test"}}}});
    expect(200, {"POST", "/v1/hosts/{host}/retire", "web-9"}, ada_);
}

void DescribedCentre::askQuestions() {
    const KeyPair& bus = buses_.at("web-1");
    const auto host = fleet_->connect(bus, fleet_->hostToken(bus));
    ASSERT_TRUE(host.connection) << host.text;
    const auto subscribed = host.connection->subscribe(
        "rp.ask." + web_,
        [&](const fleet::BusMessage& message) {
            const std::string id = fleet::readOrder(message.data).order.id;
            static_cast<void>(host.connection->publish(
                "ans." + web_, signAnswer({web_, id, 0, true, "sealed"}, signers_.at("web-1"))));
        },
        kPatience);
    ASSERT_TRUE(subscribed.status.done()) << subscribed.status.text;
    fleet::Order asked;
    asked.fleet = "demo";
    asked.id = fleet::makeOrderId();
    asked.host = web_;
    asked.selector = "*";
    asked.kind = fleet::kAsksTasks;
    asked.body = "{}";
    asked.issued = today();
    asked.expires = today() + fleet::kLongestQuestion;
    const std::string text = fleet::base64Of(signQuestion(asked, ada_.key, ada_.certificate));
    const json round = expect(201, {"POST", "/v1/questions"}, ada_, {{"questions", {text}}});
    ASSERT_TRUE(eventually([&] {
        return !expect(200, {"GET", "/v1/questions/{round}", round["round"]}, ada_)["answers"]
                    .empty();
    }));
    expect(404, {"GET", "/v1/questions/{round}", "none"}, ada_);
}

void DescribedCentre::bringFiles() {
    const auto sumOf = [](const std::string& content) {
        fleet::Checksum sum;
        if (!content.empty()) sum.add(content);
        return sum.hex();
    };
    const Asked content{"GET", "/v1/files/{sha256}/content", sumOf("package")};
    expect(404, {"GET", "/v1/files/{sha256}", content.value, "?size=7"}, ada_);
    expect(200, {"POST", "/v1/files/{sha256}", content.value, "?size=7&from=0"}, ada_.session,
           "package");
    expect(200, {"GET", "/v1/files/{sha256}", content.value, "?size=7"}, ada_);
    expect(507, {"POST", "/v1/files/{sha256}", content.value, "?size=999999999999999&from=0"},
           ada_.session, "x");
    const Asked empty{"GET", "/v1/files/{sha256}/content", sumOf("")};
    expect(200, {"POST", "/v1/files/{sha256}", empty.value, "?size=0&from=0"}, ada_);
    const std::vector<fleet::OrderFile> files = {{"ux.tar", content.value, 7},
                                                 {"none", empty.value, 0}};
    expect(201, {"POST", "/v1/rollouts"}, ada_,
           {{"orders", {orderFor(web_, ada_, fleet::makeOrderId(), files)}}});
    const std::string session =
        expect(200, {"POST", "/v1/sessions"}, "", sessionRequest(signers_.at("web-1")))["session"];
    ASSERT_TRUE(eventually([&] {
        return ask("GET", "/v1/hosts/web-1/orders", ada_.session).document["orders"].size() == 1;
    }));
    expect(206, content, session);
    expect(200, empty, session);
    expect(401, content, ada_);
}

void DescribedCentre::rollOut() {
    const json batch = expect(201, {"POST", "/v1/batches"}, ada_)["batch"];
    const std::string order = fleet::makeOrderId();
    expect(200, {"POST", "/v1/batches/{batch}/orders", batch}, ada_,
           {{"orders", {orderFor(web_, ada_, order)}}});
    expect(404, {"POST", "/v1/batches/{batch}/orders", "none"}, ada_, {{"orders", json::array()}});
    const std::string id = expect(201, {"POST", "/v1/rollouts"}, ada_,
                                  {{"batch", batch},
                                   {"waves", "100%"},
                                   {"pause", 0.5},
                                   {"wait", 600},
                                   {"parallel", 1}})["id"];
    expect(200, {"GET", "/v1/rollouts"}, ada_);
    expect(200, {"POST", "/v1/rollouts/{id}/pause", id}, ada_);
    expect(409, {"POST", "/v1/rollouts/{id}/pause", id}, ada_);
    expect(200, {"POST", "/v1/rollouts/{id}/resume", id}, ada_, json::object());
    ASSERT_TRUE(eventually([&] {
        return ask("GET", "/v1/rollouts/" + id, ada_.session).document["counts"]["released"] == 1;
    }));
    tellOutcome(web_, 2, order, "failed");
    ASSERT_TRUE(isInState(id, "finished"));
    expect(200, {"GET", "/v1/rollouts/{id}", id}, ada_);
    expect(404, {"GET", "/v1/rollouts/{id}", "none"}, ada_);
    expect(200, {"GET", "/v1/rollouts/{id}/hosts", id}, ada_);
    expect(200, {"GET", "/v1/rollouts/{id}/failures", id}, ada_);
    expect(200, {"GET", "/v1/rollouts/{id}/to-sign", id, "?for=retry-failed"}, ada_);
    expect(200, {"POST", "/v1/rollouts/{id}/retry-failed", id}, ada_,
           {{"orders", {orderFor(web_, ada_)}}});
    expect(200, {"POST", "/v1/rollouts/{id}/abort", id}, ada_, json::object());
    expect(200, {"GET", "/v1/hosts/{host}/orders", "web-1"}, ada_);
    expect(200, {"GET", "/v1/orders/{order}", order}, ada_);
    expect(404, {"GET", "/v1/orders/{order}", fleet::makeOrderId()}, ada_);
}

/// Until there was one of each kind.
void DescribedCentre::readEvents(http::EventSource& source) {
    std::set<std::string> wanted = {"host", "order", "rollout", "gap"};
    ASSERT_TRUE(eventually([&] {
        std::istringstream text(source.take());
        std::string name;
        for (std::string line; std::getline(text, line);) {
            if (line.rfind("event: ", 0) == 0) name = line.substr(7);
            if (line.rfind("data: ", 0) != 0) continue;
            wanted.erase(name);
            answers_.push_back({{"method", "GET"},
                                {"path", "/v1/events"},
                                {"target", "/v1/events"},
                                {"event", name},
                                {"data", json::parse(line.substr(6))}});
        }
        return wanted.empty();
    })) << "no event "
        << *wanted.begin();
}

void DescribedCentre::judge() {
    const ScratchDir scratch;
    const std::string file = scratch.write(
        "answers.json",
        json{{"description", json::parse(describe(fleet::apiRoutes()))}, {"answers", answers_}}
            .dump());
    const ProgramResult result = runProgram(
        {"/usr/bin/python3", ZAV_SOURCE_DIR "/tests/fleet/server/api/described_answers.py", file},
        "", {{"PYTHONDONTWRITEBYTECODE", "1"}}, std::chrono::minutes(4));
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_NE(result.out.find(" operations"), std::string::npos) << result.out;
}

TEST_F(DescribedCentre, AnswersAsItsDescriptionSays) {
    ada_ = admin();
    http::Request request{"GET", "/v1/events", "", {0, 0, 0, http::Access::Act}};
    request.authorization = "Bearer " + ada_.session;
    request.lastEventId = "0123456789abcdef-1";
    http::Answer stream = std::get<http::Job>(api_->handle(std::move(request)))();
    web_ = join("web-1");
    askPeople();
    askHosts();
    askQuestions();
    bringFiles();
    rollOut();
    readEvents(*std::get<std::unique_ptr<http::EventSource>>(stream));
    judge();
}

}  // namespace
