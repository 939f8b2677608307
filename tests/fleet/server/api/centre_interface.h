/// The centre's interface with a real centre behind it, without its connections.
#pragma once

#include <gtest/gtest.h>

#include <future>
#include <map>
#include <memory>
#include <nlohmann/json.hpp>
#include <stdexcept>
#include <string>
#include <variant>
#include <vector>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/enrolment.h"
#include "fleet/bus/messages/hello_bytes.h"
#include "fleet/bus/messages/login.h"
#include "fleet/bus/messages/order.h"
#include "fleet/server/api/centre_api.h"
#include "fleet/server/api/routes.h"
#include "fleet/server/keys/trust/host_enrolment.h"
#include "tests/fleet/server/keys/running_fleet.h"

namespace centre_interface {

using fleet::KeyKind;
using fleet::KeyPair;
using fleet::OperatorGrant;
using fleet::Role;
using made_fleet::RunningFleet;
using made_fleet::today;
using nlohmann::json;

struct Answered {
    unsigned status = 0;
    json document;
};

/// An operator's key with what makes it count.
struct LoggedIn {
    KeyPair key = KeyPair::make(KeyKind::User);
    std::string certificate;
    std::string session;
};

class CentreInterface : public testing::Test {
protected:
    /// `withConsole`: as a centre that serves the console, too.
    explicit CentreInterface(bool withConsole = false) : withConsole_(withConsole) { start(); }
    ~CentreInterface() override { stop(); }

    void start() {
        service_ = std::make_unique<fleet::CentreService>(
            fleet::ServiceOptions{fleet_->made().directory().path()});
        running_ = std::async(std::launch::async, [this] { return service_->run(); });
        if (!eventually([this] { return service_->centre().isWorking(); },
                        made_fleet::kWorksWithin)) {
            throw std::runtime_error("the centre does not work");
        }
        services_ = std::make_unique<fleet::ApiServices>(*service_, withConsole_);
        api_ = std::make_unique<fleet::CentreApi>(*services_, fleet::apiRoutes());
    }
    void stop() {
        service_->end();
        running_.get();
    }
    /// Another centre on the same directory.
    void startAgain() {
        stop();
        api_.reset();
        services_.reset();
        service_.reset();
        start();
    }

    Answered ask(const std::string& method, const std::string& target,
                 const std::string& session = "", const std::string& body = "") {
        http::Request request{method, target, body, {0, 0, 0, http::Access::Act}};
        if (!session.empty()) request.authorization = "Bearer " + session;
        auto handled = api_->handle(std::move(request));
        if (auto* const job = std::get_if<http::Job>(&handled)) handled = (*job)();
        const auto& reply = std::get<http::Reply>(std::get<http::Answer>(handled));
        return {reply.status, json::parse(reply.body)};
    }
    Answered get(const std::string& target, const LoggedIn& who) {
        return ask("GET", target, who.session);
    }
    Answered post(const std::string& target, const LoggedIn& who, const json& body = {}) {
        return ask("POST", target, who.session, body.is_null() ? "" : body.dump());
    }

    std::string sessionRequest(const KeyPair& key) const {
        return signSessionRequest({services_->facts.fleet, key.publicKey(), services_->facts.url,
                                   today(), fleet::makeOrderId()},
                                  key);
    }
    /// An operator who has got their certificate and opened a session.
    LoggedIn login(const OperatorGrant& grant) {
        LoggedIn who;
        const std::string token = services_->withTrust([&](sqlite::Database& database) {
            return fleet::Operators(database).invite(grant, made_fleet::kDay, today());
        });
        const std::string request = signLogin({"demo", token, who.key.publicKey()}, who.key);
        const Answered waits = ask("POST", "/v1/logins", "", request);
        EXPECT_EQ(waits.status, 200U) << waits.document;
        EXPECT_FALSE(waits.document.contains("certificate"));
        services_->withTrust([&](sqlite::Database& database) {
            fleet::Operators(database).certify({who.key.publicKey()}, fleet_->made().root(),
                                               today());
            return 0;
        });
        const Answered answer = ask("POST", "/v1/logins", "", request);
        who.certificate =
            fleet::bytesOfBase64(answer.document.at("certificate").get<std::string>());
        who.session =
            ask("POST", "/v1/sessions", "", sessionRequest(who.key)).document.value("session", "");
        EXPECT_FALSE(who.session.empty());
        return who;
    }
    LoggedIn admin() { return login({"ada", Role::Admin, {}, {}, "*", made_fleet::kDay}); }

    /// A host that has joined; returns its bus key.
    std::string join(const std::string& name, const fleet::Labels& labels = {}) {
        const KeyPair bus = KeyPair::make(KeyKind::User);
        const KeyPair signing = KeyPair::make(KeyKind::User);
        const std::string token = services_->withTrust([&](sqlite::Database& database) {
            return fleet::HostEnrolment(database).invite({name, labels}, today());
        });
        const Answered answer =
            ask("POST", "/v1/enrolments", "",
                signEnrolment({"demo", token, bus.publicKey(), signing.publicKey(), "machine"}, bus,
                              signing));
        EXPECT_EQ(answer.status, 200U) << answer.document;
        EXPECT_EQ(fleet::readEnrolmentAnswer(answer.document.dump()).name, name);
        signers_.emplace(name, signing);
        buses_.emplace(name, bus);
        return bus.publicKey();
    }

    static std::string orderFor(const std::string& host, const LoggedIn& who,
                                const std::string& id = fleet::makeOrderId(),
                                const std::vector<fleet::OrderFile>& files = {}) {
        fleet::Order order;
        order.fleet = "demo";
        order.id = id;
        order.host = host;
        order.selector = "*";
        order.kind = "START";
        order.body = R"({"product":"ux"})";
        order.files = files;
        order.issued = today();
        order.expires = today() + made_fleet::kDay;
        return fleet::base64Of(signOrder(order, who.key, who.certificate));
    }

    /// As the host's link does.
    void sayHello(const std::string& name, const std::string& blocked = "") {
        const fleet::KeyPair& bus = buses_.at(name);
        const auto host = fleet_->connect(bus, fleet_->hostToken(bus));
        ASSERT_TRUE(host.connection) << host.text;
        fleet::Hello hello;
        hello.machine = "machine";
        hello.session = fleet::makeOrderId();
        hello.nonce = fleet::makeOrderId();
        hello.journal = "j1";
        hello.journalNow = "j1";
        hello.blocked = blocked;
        hello.time = made_fleet::today();
        const auto answer = host.connection->request(
            "hello." + bus.publicKey(), signHello(bus.publicKey(), hello, signers_.at(name)),
            made_fleet::kPatience);
        ASSERT_TRUE(answer.status.done()) << answer.status.text;
    }

    // Keys of the hosts that have joined, by their names.
    std::map<std::string, KeyPair> signers_;
    std::map<std::string, KeyPair> buses_;
    const bool withConsole_;
    const std::unique_ptr<RunningFleet> fleet_ = RunningFleet::start();
    std::unique_ptr<fleet::CentreService> service_;
    std::future<fleet::CentreProgram::End> running_;
    std::unique_ptr<fleet::ApiServices> services_;
    std::unique_ptr<fleet::CentreApi> api_;
};

}  // namespace centre_interface
