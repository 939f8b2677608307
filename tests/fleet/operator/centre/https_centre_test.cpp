// ctest-label: threaded
#include "fleet/operator/centre/https_centre.h"

#include <gtest/gtest.h>

#include <chrono>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "fleet/bus/messages/session.h"
#include "tests/fleet/https/tls_server.h"
#include "tests/fleet/operator/certified.h"

namespace {

using fleet::HttpsCentre;
using fleet_test::TlsPeer;
using fleet_test::TlsServer;
using nlohmann::json;
using operator_test::failureOf;

class HttpsCentreTest : public testing::Test {
protected:
    /// The operator of a fleet whose centre is that server.
    fleet::OperatorIdentity identityAt(const TlsServer& server) const {
        fleet::OperatorIdentity identity = root_.certified({"START"}, {"ux"});
        identity.url = server.url();
        identity.authority = authority_.certificate();
        return identity;
    }
    static fleet::HttpsClient::Deadline soon() {
        return std::chrono::steady_clock::now() + std::chrono::seconds(20);
    }
    static std::string bodyOf(const std::string& request) {
        return request.substr(request.find("\r\n\r\n") + 4);
    }

    const operator_test::Root root_;
    const fleet::Moment now_ = fleet_test::wallTime();
    const fleet::CertificateAuthority authority_ =
        fleet::CertificateAuthority::make("demo", now_, now_ + operator_test::kHour);
    const fleet::ServerCertificate certificate_ =
        authority_.issue({"centre.example", "127.0.0.1"}, now_, now_ + operator_test::kHour);
};

TEST_F(HttpsCentreTest, OpensASessionWithTheOperatorsKeyAndAsksInIt) {
    std::vector<std::string> seen;
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        for (const char* const body : {R"({"session":"s1"})", R"({"a":1})", R"({"b":2})"}) {
            seen.push_back(peer.request());
            peer.answer(200, body);
        }
    });
    const fleet::OperatorIdentity identity = identityAt(server);
    HttpsCentre centre(identity, soon());
    EXPECT_EQ(centre.get("/v1/whoami"), (json{{"a", 1}}));
    EXPECT_EQ(centre.post("/v1/batches", json::object()), (json{{"b", 2}}));
    server.join();
    ASSERT_EQ(seen.size(), 3U);
    const fleet::SessionRequest asked = fleet::readSessionRequest(bodyOf(seen[0]));
    EXPECT_EQ(asked.fleet, "demo");
    EXPECT_EQ(asked.key, identity.key.publicKey());
    EXPECT_EQ(asked.url, server.url());
    EXPECT_LT(fleet_test::wallTime() - asked.time, std::chrono::seconds(60));
    EXPECT_NE(seen[1].find("GET /v1/whoami HTTP/1.1\r\n"), std::string::npos);
    EXPECT_NE(seen[1].find("Authorization: Bearer s1\r\n"), std::string::npos);
    EXPECT_EQ(bodyOf(seen[2]), "{}");
}

TEST_F(HttpsCentreTest, WaitsNoLongerForACentreThatSaysNothingThanItWasTold) {
    TlsServer server(certificate_, [](TlsServer& self) {
        TlsPeer peer = self.accept();
        peer.request();
        peer.request();  // until the client goes
    });
    HttpsCentre centre(identityAt(server), soon());
    centre.answersWithin(std::chrono::seconds(1));
    const auto begun = std::chrono::steady_clock::now();
    EXPECT_EQ(failureOf([&] { centre.get("/v1/whoami"); }).status(), ctl::kNoOutcome);
    EXPECT_LT(std::chrono::steady_clock::now() - begun, std::chrono::seconds(15))
        << "the command's own time is 20 s";
    server.join();
}

TEST_F(HttpsCentreTest, OpensAnotherSessionWhenOneHasEnded) {
    std::vector<std::string> seen;
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        const auto answer = [&](int status, const char* body) {
            seen.push_back(peer.request());
            peer.answer(status, body);
        };
        answer(200, R"({"session":"s1"})");
        answer(200, "{}");
        answer(401, R"({"error":"there is no such session"})");
        answer(200, R"({"session":"s2"})");
        answer(200, R"({"a":1})");
    });
    HttpsCentre centre(identityAt(server), soon());
    centre.get("/1");
    EXPECT_EQ(centre.get("/2"), (json{{"a", 1}}));
    server.join();
    ASSERT_EQ(seen.size(), 5U);
    EXPECT_NE(seen[4].find("Authorization: Bearer s2\r\n"), std::string::npos);
}

TEST_F(HttpsCentreTest, DoesNotAskForSessionsForEver) {
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        peer.request();
        peer.answer(200, R"({"session":"s1"})");
        peer.request();
        peer.answer(401, R"({"error":"no"})");
    });
    HttpsCentre centre(identityAt(server), soon());
    EXPECT_EQ(failureOf([&] { centre.get("/"); }).status(), ctl::kHostReportedFailure);
}

/// A centre that answers a request for a session, and what becomes of that.
class OddCentre : public HttpsCentreTest {
protected:
    ctl::Failure failureAt(int status, const std::string& body) {
        TlsServer server(certificate_, [&](TlsServer& self) {
            TlsPeer peer = self.accept();
            peer.request();
            peer.answer(status, body);
        });
        HttpsCentre centre(identityAt(server), soon());
        return failureOf([&] { centre.get("/"); });
    }
};

TEST_F(OddCentre, RefusesTheOperator) {
    const ctl::Failure failure = failureAt(403, R"({"error":"the key is revoked"})");
    EXPECT_EQ(failure.status(), ctl::kHostReportedFailure);
    EXPECT_EQ(std::string(failure.what()), "the centre refused the request: the key is revoked");
}

TEST_F(OddCentre, GivesNoSession) {
    for (const char* const body : {"", "[]", "{}", "hello", R"({"session":""})",
                                   R"({"session":"a\r\nb"})", R"({"session":1})"}) {
        EXPECT_EQ(failureAt(200, body).status(), ctl::kNoHost) << body;
    }
}

TEST_F(HttpsCentreTest, BelievesNoOtherAuthority) {
    TlsServer server(certificate_, [](TlsServer& self) { self.accept(); });
    fleet::OperatorIdentity identity = identityAt(server);
    identity.authority =
        fleet::CertificateAuthority::make("demo", now_, now_ + operator_test::kHour).certificate();
    HttpsCentre centre(identity, soon());
    EXPECT_EQ(failureOf([&] { centre.get("/"); }).status(), ctl::kNoHost);
}

}  // namespace
