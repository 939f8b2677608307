// ctest-label: threaded
#include "fleet/operator/verbs/login.h"

#include <gtest/gtest.h>

#include <chrono>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <vector>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/login.h"
#include "fleet/https/client/https_error.h"
#include "support/scratch_dir.h"
#include "tests/fleet/https/tls_server.h"
#include "tests/fleet/operator/certified.h"

namespace {

using fleet_test::TlsPeer;
using fleet_test::TlsServer;
using operator_test::failureOf;

class OperatorLogin : public testing::Test {
protected:
    fleet::Invitation invitationTo(const TlsServer& server) const {
        return {server.url(), fleet::fingerprintOfCertificate(authority_.certificate()), "demo",
                root_.key.publicKey(), token_};
    }
    /// The centre's answer to a login: with a certificate for its key, if that is certified.
    std::string answerTo(const std::string& request, bool isCertified) const {
        const std::string body = request.substr(request.find("\r\n\r\n") + 4);
        const fleet::LoginRequest login = fleet::readLogin(body);
        fleet::LoginAnswer answer;
        if (isCertified) answer.certificate = certificateFor(login.key);
        return loginAnswerText(answer);
    }
    std::string certificateFor(const std::string& key) const {
        fleet::Certificate certificate;
        certificate.fleet = "demo";
        certificate.name = "mary";
        certificate.key = key;
        certificate.until = now_ + operator_test::kHour;
        certificate.selector = "*";
        return signCertificate(certificate, root_.key);
    }
    static ctl::Deadline soon() { return ctl::deadlineIn(std::chrono::seconds(20)); }
    fleet::OperatorIdentity logIn(const TlsServer& server) {
        return fleet::logIn(files_, invitationTo(server), soon(),
                            {[this](const std::string& key) { waiting_.push_back(key); },
                             [this](std::chrono::milliseconds) { ++pauses_; }});
    }

    const operator_test::Root root_;
    const std::string token_ = fleet::makeJoinToken();
    const fleet::Moment now_ = fleet_test::wallTime();
    const fleet::CertificateAuthority authority_ =
        fleet::CertificateAuthority::make("demo", now_, now_ + operator_test::kHour);
    const fleet::ServerCertificate certificate_ =
        authority_.issue({"centre.example", "127.0.0.1"}, now_, now_ + operator_test::kHour);
    const ScratchDir scratch_;
    const fleet::OperatorFiles files_{scratch_.path("fleet")};
    std::vector<std::string> waiting_;
    int pauses_ = 0;
};

TEST_F(OperatorLogin, WaitsForTheCertificateAndKeepsItWithTheKey) {
    std::vector<std::string> keys;
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        for (const bool isCertified : {false, false, true}) {
            const std::string request = peer.request();
            if (request.empty()) return;
            keys.push_back(fleet::readLogin(request.substr(request.find("\r\n\r\n") + 4)).key);
            peer.answer(200, answerTo(request, isCertified));
        }
    });
    const fleet::OperatorIdentity made = logIn(server);
    server.join();
    const std::string key = made.key.publicKey();
    EXPECT_EQ(keys, (std::vector<std::string>{key, key, key}));
    EXPECT_EQ(waiting_, std::vector<std::string>{key});
    EXPECT_EQ(pauses_, 2);
    const std::optional<fleet::OperatorIdentity> kept = files_.identity(server.url());
    ASSERT_TRUE(kept.has_value());
    EXPECT_EQ(kept->key.publicKey(), key);
    EXPECT_EQ(kept->grant().name, "mary");
    EXPECT_EQ(kept->authority, authority_.certificate());
    EXPECT_FALSE(files_.pendingLogin(server.url()).has_value());
}

TEST_F(OperatorLogin, GoesOnWithTheSameKeyWhenItWasBrokenOff) {
    TlsServer server(certificate_, [&](TlsServer& self) {
        for (const bool isCertified : {false, true}) {
            TlsPeer peer = self.accept();
            const std::string request = peer.request();
            if (!request.empty()) peer.answer(200, answerTo(request, isCertified));
        }
    });
    struct BrokenOff {};
    const auto breakOff = [](std::chrono::milliseconds) { throw BrokenOff{}; };
    EXPECT_THROW(fleet::logIn(files_, invitationTo(server), soon(), {{}, breakOff}), BrokenOff);
    ASSERT_TRUE(files_.pendingLogin(server.url()).has_value());
    const std::string key = files_.pendingLogin(server.url())->key.publicKey();
    EXPECT_EQ(logIn(server).key.publicKey(), key);
}

TEST_F(OperatorLogin, KeepsNoCertificateThatDoesNotCount) {
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        peer.request();
        fleet::LoginAnswer answer;
        answer.certificate = certificateFor(operator_test::newUser().publicKey());
        peer.answer(200, loginAnswerText(answer));
    });
    EXPECT_THROW(logIn(server), fleet::MessageError);
    EXPECT_FALSE(files_.identity(server.url()).has_value());
}

TEST_F(OperatorLogin, TellsWhyTheCentreRefuses) {
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        peer.request();
        peer.answer(403, R"({"error":"the invitation has ended"})");
    });
    const ctl::Failure failure = failureOf([&] { logIn(server); });
    EXPECT_EQ(failure.status(), ctl::kHostReportedFailure);
    EXPECT_EQ(std::string(failure.what()),
              "the centre refused the request: the invitation has ended");
}

TEST_F(OperatorLogin, GivesItsTokenToNobodyElse) {
    const auto other = fleet::CertificateAuthority::make("demo", now_, now_ + operator_test::kHour);
    std::string seen = "nothing";
    TlsServer server(
        other.issue({"centre.example", "127.0.0.1"}, now_, now_ + operator_test::kHour),
        [&](TlsServer& self) { seen = self.accept().request(); });
    EXPECT_THROW(logIn(server), fleet::HttpsError);
    server.join();
    EXPECT_EQ(seen, "");
}

}  // namespace
