// ctest-label: threaded
// The centre's interface as its clients reach it.
#include "fleet/server/api/api_server.h"

#include <gtest/gtest.h>

#include <future>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>

#include "fleet/https/client/https_client.h"
#include "fleet/https/front/front_error.h"
#include "fleet/server/keys/tls/certificate_authority.h"
#include "tests/fleet/server/keys/running_fleet.h"

namespace {

using fleet::HttpsClient;
using fleet::HttpsError;
using fleet::ServerTrust;
using made_fleet::RunningFleet;
using nlohmann::json;

class ServedCentre : public testing::Test {
protected:
    ServedCentre() {
        service_ = std::make_unique<fleet::CentreService>(
            fleet::ServiceOptions{fleet_->made().directory().path()});
        server_ = std::make_unique<fleet::ApiServer>(*service_, fleet::ListenPlace{"127.0.0.1", 0});
        running_ = std::async(std::launch::async, [this] { return service_->run(); });
        eventually([this] { return service_->centre().isWorking(); }, made_fleet::kWorksWithin);
    }
    ~ServedCentre() override {
        server_.reset();
        service_->end();
        running_.get();
    }
    std::string authority() const { return fleet_->made().directory().authority(); }
    fleet::ServerUrl url() const { return {"localhost", std::to_string(server_->port())}; }
    static HttpsClient::Deadline deadline() {
        return std::chrono::steady_clock::now() + made_fleet::kPatience;
    }

    const std::unique_ptr<RunningFleet> fleet_ = RunningFleet::start();
    std::unique_ptr<fleet::CentreService> service_;
    std::unique_ptr<fleet::ApiServer> server_;
    std::future<fleet::CentreProgram::End> running_;
};

TEST_F(ServedCentre, IsReachedByThoseWhoTrustItsAuthority) {
    HttpsClient client(url(), ServerTrust::byAuthority(authority()));
    const fleet::HttpsAnswer answer = client.ask({"GET", "/v1/health"}, deadline());
    EXPECT_EQ(answer.status, 200U);
    EXPECT_EQ(json::parse(answer.body)["fleet"], "demo");
    EXPECT_EQ(client.ask({"GET", "/v1/hosts"}, deadline()).status, 401U);
    EXPECT_EQ(client.ask({"GET", "/v1/nothing"}, deadline()).status, 404U);
    EXPECT_EQ(client.ask({"GET", "/v1/hosts", "", "", "no session"}, deadline()).status, 401U);
}

TEST_F(ServedCentre, IsReachedWithAnInvitationsFingerprint) {
    const std::string fingerprint = fleet::fingerprintOfCertificate(authority());
    HttpsClient client(url(), ServerTrust::byFingerprint(fingerprint));
    EXPECT_EQ(client.ask({"GET", "/v1/health"}, deadline()).status, 200U);
    EXPECT_EQ(fleet::fingerprintOfCertificate(client.authority()), fingerprint);
    HttpsClient stranger(url(), ServerTrust::byFingerprint(std::string(64, 'a')));
    EXPECT_THROW(stranger.ask({"GET", "/v1/health"}, deadline()), HttpsError);
}

TEST_F(ServedCentre, TakesNoBodyThatIsTooLong) {
    HttpsClient client(url(), ServerTrust::byAuthority(authority()));
    const std::string most(1024 * 1024, 'x');
    EXPECT_EQ(client.ask({"POST", "/v1/logins", most}, deadline()).status, 400U);
    EXPECT_EQ(client.ask({"POST", "/v1/logins", most + "x"}, deadline()).status, 413U);
}

TEST_F(ServedCentre, ServesBrowsersOnlyIfItHasAPage) {
    HttpsClient client(url(), ServerTrust::byAuthority(authority()));
    EXPECT_EQ(client.ask({"GET", "/"}, deadline()).status, 404U);
    const fleet::ApiServer console(*service_, {"127.0.0.1", 0},
                                   {{"/index.html", "text/html", "<!doctype html>", ""}});
    HttpsClient browser({"localhost", std::to_string(console.port())},
                        ServerTrust::byAuthority(authority()));
    EXPECT_EQ(browser.ask({"GET", "/v1/health"}, deadline()).status, 200U);
    const fleet::HttpsAnswer refused = browser.ask({"GET", "/"}, deadline());
    EXPECT_EQ(refused.status, 403U) << "this is not the port that the fleet's URL names";
    EXPECT_NE(refused.body.find("its own address"), std::string::npos) << refused.body;
}

TEST_F(ServedCentre, SaysThatItsPortIsTaken) {
    EXPECT_THROW(fleet::ApiServer(*service_, {"127.0.0.1", server_->port()}), fleet::FrontError);
}

}  // namespace
