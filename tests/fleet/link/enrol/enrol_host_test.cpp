// ctest-label: threaded
#include "fleet/link/enrol/enrol_host.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

#include "fleet/bus/accounts/token.h"
#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/enrolment.h"
#include "fleet/link/enrol/invited_host.h"
#include "fleet/link/program/link_configuration.h"
#include "fleet/link/program/link_file.h"

namespace {

using fleet::EnrolledAs;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::LinkConfiguration;
using fleet::LinkFile;
using joining::kDay;
using joining::kNow;

class EnrollingHost : public testing::Test {
protected:
    bool isEnrolled() const { return host_.scratch.exists("link/link.json"); }
    bool isConfigured() const { return host_.scratch.exists("zavlink.toml"); }
    static mode_t modeOf(const std::string& path) {
        struct stat found {};
        EXPECT_EQ(::stat(path.c_str(), &found), 0) << path;
        return found.st_mode & 07777U;
    }
    LinkConfiguration configuration() const {
        return fleet::parseLinkConfiguration(host_.scratch.read("zavlink.toml"), "zavlink.toml");
    }
    /// An answer that was changed so does not make the host a member.
    std::string refusalOf(const std::function<void(fleet::EnrolmentAnswer&)>& change) {
        host_.startCentre(host_.takesUpWith(change));
        host_.options.invitation = host_.invitation("web" + std::to_string(++hosts_));
        std::string words = host_.refusal();
        EXPECT_FALSE(isEnrolled());
        EXPECT_FALSE(isConfigured());
        return words;
    }

    fleet_test::InvitedHost host_;
    int hosts_ = 0;
};

TEST_F(EnrollingHost, HasAllThatALinkNeeds) {
    host_.startCentre(host_.takesUp());
    host_.options.invitation = host_.invitation();
    host_.options.labels = {{"env", "test"}};
    host_.options.hostSocket = "/run/other.sock";
    const EnrolledAs enrolled = enrolHost(host_.options, kNow);
    const fleet::FleetFacts facts = host_.fleet.made.directory().facts();
    EXPECT_EQ(enrolled.name, "web1");
    EXPECT_EQ(enrolled.fleet, "demo");
    const LinkConfiguration read = configuration();
    EXPECT_EQ(read.fleet, "demo");
    EXPECT_EQ(read.name, "web1");
    EXPECT_EQ(facts.busUrls, std::vector<std::string>{"nats://localhost:4222"});
    EXPECT_EQ(read.bus, std::vector<std::string>{"tls://localhost:4222"});
    EXPECT_EQ(read.serverName, "localhost");
    EXPECT_EQ(read.root, facts.root);
    EXPECT_EQ(read.centres,
              std::vector<std::string>{host_.fleet.made.directory().centre().key.publicKey()});
    EXPECT_EQ(read.hostSocket, "/run/other.sock");
    EXPECT_EQ(read.state, host_.options.directory);
    EXPECT_EQ(read.labels, (fleet::Labels{{"env", "test"}}));
    EXPECT_EQ(read.ca, host_.options.directory + "/ca.pem");
    EXPECT_EQ(host_.scratch.read("link/ca.pem"), host_.fleet.made.directory().authority());
    const LinkFile file(host_.options.directory);
    EXPECT_EQ(file.bus().publicKey(), enrolled.host);
    EXPECT_TRUE(fleet::isTokenSignedBy(file.token(), facts.accounts.hostSigner));
    ASSERT_EQ(host_.fleet.hosts.hosts.size(), 1U);
    EXPECT_EQ(host_.fleet.hosts.hosts[0].host, enrolled.host);
    EXPECT_EQ(host_.fleet.hosts.hosts[0].signing, file.signing().publicKey());
    EXPECT_FALSE(host_.scratch.exists("link/joining.json"));
}

TEST_F(EnrollingHost, TellsOnlyWhatTheCentreMustKnow) {
    host_.startCentre(host_.takesUp());
    host_.options.invitation = host_.invitation();
    EXPECT_EQ(host_.refusal(), "");
    host_.centre->join();
    ASSERT_EQ(host_.requests.size(), 1U);
    EXPECT_EQ(host_.requests[0].rfind("POST /v1/enrolments HTTP/1.1\r\n", 0), 0U);
    EXPECT_EQ(host_.requests[0].find("0123456789abcdef"), std::string::npos)
        << "the machine's identity is confidential";
    const LinkFile file(host_.options.directory);
    EXPECT_EQ(host_.requests[0].find(file.bus().seed()), std::string::npos);
}

TEST_F(EnrollingHost, KeepsSecretsForItsUser) {
    host_.startCentre([](fleet_test::TlsPeer&, const std::string&) {}, 1);
    host_.options.invitation = host_.invitation();
    host_.options.directory = host_.scratch.path("new");
    EXPECT_NE(host_.refusal(), "");
    EXPECT_EQ(modeOf(host_.scratch.path("new")), 0700U);
    EXPECT_EQ(modeOf(host_.scratch.path("new/joining.json")), 0600U);
}

TEST_F(EnrollingHost, ComesAgainWithTheSameKeysWhenTheAnswerWasLost) {
    host_.startCentre([this](fleet_test::TlsPeer&, const std::string& body) {
        host_.fleet.redeem(body);  // and it never answers
    });
    const std::string invitation = host_.invitation();
    host_.options.invitation = invitation;
    EXPECT_NE(host_.refusal().find("; the same invitation may be used for another try"),
              std::string::npos);
    EXPECT_FALSE(isEnrolled());
    EXPECT_TRUE(host_.scratch.exists("link/joining.json"));
    fleet::Invitation same = fleet::readInvitation(invitation);
    host_.startCentre(host_.takesUp());
    same.url = host_.centre->url();
    host_.options.invitation = invitationText(same);
    const EnrolledAs enrolled = enrolHost(host_.options, kNow);
    ASSERT_EQ(host_.fleet.hosts.hosts.size(), 2U) << "told again";
    EXPECT_EQ(host_.fleet.hosts.hosts[0].host, enrolled.host);
    EXPECT_EQ(host_.fleet.hosts.hosts[1].host, enrolled.host);
}

TEST_F(EnrollingHost, ComesWithOtherKeysForAnotherInvitation) {
    host_.startCentre(
        [this](fleet_test::TlsPeer&, const std::string& body) { host_.fleet.redeem(body); });
    host_.options.invitation = host_.invitation("web1");
    EXPECT_NE(host_.refusal(), "");
    host_.startCentre(host_.takesUp());
    host_.options.invitation = host_.invitation("web2");
    const EnrolledAs enrolled = enrolHost(host_.options, kNow);
    EXPECT_EQ(enrolled.name, "web2");
    EXPECT_NE(host_.fleet.hosts.hosts[0].host, enrolled.host);
}

TEST_F(EnrollingHost, GoesOnWhereItWasKilledBeforeItsLastStep) {
    host_.startCentre(host_.takesUp());
    const std::string invitation = host_.invitation();
    host_.options.invitation = invitation;
    host_.scratch.makeDir("link/link.json.new");  // where the file is written first
    EXPECT_NE(host_.refusal(), "");
    EXPECT_TRUE(isConfigured());
    EXPECT_FALSE(isEnrolled());
    std::filesystem::remove(host_.scratch.path("link/link.json.new"));
    fleet::Invitation same = fleet::readInvitation(invitation);
    host_.startCentre(host_.takesUp());
    same.url = host_.centre->url();
    host_.options.invitation = invitationText(same);
    EXPECT_EQ(host_.refusal(), "");
    EXPECT_TRUE(isEnrolled());
}

TEST_F(EnrollingHost, SaysThatItIsEnrolledAlready) {
    host_.startCentre(host_.takesUp());
    host_.options.invitation = host_.invitation();
    EXPECT_EQ(host_.refusal(), "");
    const std::string before = host_.scratch.read("link/link.json");
    host_.options.invitation = host_.invitation("web2");
    EXPECT_EQ(host_.refusal(),
              host_.options.directory + "/link.json: this host has been enrolled already");
    EXPECT_EQ(host_.scratch.read("link/link.json"), before);
}

TEST_F(EnrollingHost, KeepsAConfigurationThatIsThere) {
    host_.options.invitation = host_.invitation();
    host_.scratch.write("zavlink.toml", "name = \"mine\"\n");
    EXPECT_EQ(host_.refusal().rfind(host_.options.configuration + ": is there already", 0), 0U);
    EXPECT_EQ(host_.scratch.read("zavlink.toml"), "name = \"mine\"\n");
    EXPECT_FALSE(host_.scratch.exists("link/joining.json"));
}

TEST_F(EnrollingHost, PassesOnWhyTheCentreRefuses) {
    host_.startCentre([](fleet_test::TlsPeer& peer, const std::string&) {
        peer.answer(403, R"({"error":"refused: the invitation is over"})");
    });
    host_.options.invitation = host_.invitation();
    EXPECT_EQ(host_.refusal(), "the centre at " + host_.centre->url() +
                                   " does not take this host: refused: the invitation is over");
    host_.startCentre([](fleet_test::TlsPeer& peer, const std::string&) {
        peer.answer(502, "<html>a proxy</html>");
    });
    host_.options.invitation = host_.invitation();
    EXPECT_NE(host_.refusal().find("does not take this host: it answers with status 502"),
              std::string::npos);
    EXPECT_FALSE(isEnrolled());
}

TEST_F(EnrollingHost, TellsNothingToACentreThatTheInvitationDoesNotMean) {
    const auto other =
        fleet::CertificateAuthority::make("demo", host_.now, host_.now + std::chrono::hours(24));
    host_.startCentre(host_.takesUp(), 1, other);
    host_.options.invitation = host_.invitation();
    EXPECT_NE(host_.refusal(), "");
    host_.centre->join();
    EXPECT_TRUE(host_.requests.empty());
    EXPECT_TRUE(host_.fleet.hosts.hosts.empty());
}

TEST_F(EnrollingHost, TakesNoCentreThatTheRootHasNotCertified) {
    const KeyPair stranger = KeyPair::make(KeyKind::Operator);
    const KeyPair key = KeyPair::make(KeyKind::User);
    const KeyPair root = host_.fleet.made.root().root;
    fleet::Certificate certificate;
    certificate.fleet = "demo";
    certificate.holder = fleet::Certificate::Holder::Centre;
    certificate.name = "centre";
    certificate.key = key.publicKey();
    certificate.until = kNow + kDay;
    const std::string noProof =
        "the centre cannot show that the root of the fleet has certified it; it is not the one "
        "that the invitation means";
    const auto with = [&](const fleet::Certificate& shown, const KeyPair& by) {
        return refusalOf(
            [&](fleet::EnrolmentAnswer& answer) { answer.centres = {signCertificate(shown, by)}; });
    };
    EXPECT_EQ(with(certificate, stranger), noProof);
    EXPECT_EQ(refusalOf([](fleet::EnrolmentAnswer& answer) { answer.centres.clear(); }), noProof);
    fleet::Certificate ofOperator = certificate;
    ofOperator.holder = fleet::Certificate::Holder::Operator;
    EXPECT_EQ(with(ofOperator, root), noProof);
    fleet::Certificate ofAnother = certificate;
    ofAnother.fleet = "other";
    EXPECT_EQ(with(ofAnother, root), noProof);
    fleet::Certificate ended = certificate;
    ended.until = kNow;
    EXPECT_EQ(with(ended, root).rfind("the certificate of the centre has ended", 0), 0U);
}

TEST_F(EnrollingHost, GoesByAllKeysOfTheCentreThatCount) {
    const KeyPair root = host_.fleet.made.root().root;
    const auto certified = [&](const KeyPair& key, fleet::Moment until) {
        fleet::Certificate certificate;
        certificate.fleet = "demo";
        certificate.holder = fleet::Certificate::Holder::Centre;
        certificate.name = "centre";
        certificate.key = key.publicKey();
        certificate.until = until;
        return signCertificate(certificate, root);
    };
    const KeyPair newer = KeyPair::make(KeyKind::User);
    const KeyPair older = KeyPair::make(KeyKind::User);
    const KeyPair ended = KeyPair::make(KeyKind::User);
    host_.startCentre(host_.takesUpWith([&](fleet::EnrolmentAnswer& answer) {
        answer.centres = {"nothing that can be read", certified(newer, kNow + 2 * kDay),
                          certified(older, kNow + kDay), certified(ended, kNow)};
    }));
    host_.options.invitation = host_.invitation();
    EXPECT_EQ(host_.refusal(), "");
    EXPECT_EQ(configuration().centres,
              (std::vector<std::string>{newer.publicKey(), older.publicKey()}));
}

TEST_F(EnrollingHost, SpeaksToTheBusByTlsWhereverThatIs) {
    host_.startCentre(host_.takesUpWith([](fleet::EnrolmentAnswer& answer) {
        answer.busUrls = {"nats://a.example:4222", "tls://b.example:4222"};
    }));
    host_.options.invitation = host_.invitation();
    EXPECT_EQ(host_.refusal(), "");
    EXPECT_EQ(configuration().bus,
              (std::vector<std::string>{"tls://a.example:4222", "tls://b.example:4222"}));
}

TEST_F(EnrollingHost, TakesNoAnswerWithWhichALinkCouldNotWork) {
    EXPECT_NE(refusalOf([](auto& answer) {
                  answer.busUrls = {"http://elsewhere:4222"};
              }).find("\"bus\" must name servers as tls://HOST:PORT"),
              std::string::npos);
    EXPECT_NE(
        refusalOf([](auto& answer) { answer.busUrls.clear(); }).find("\"bus\" must be a list"),
        std::string::npos);
    EXPECT_EQ(refusalOf([](auto& answer) { answer.authority = "?"; }),
              "the centre's answer has no token or no certificate for the bus");
    EXPECT_EQ(refusalOf([](auto& answer) { answer.userToken = ""; }),
              "the centre's answer has no token or no certificate for the bus");
    EXPECT_EQ(refusalOf([](auto& answer) { answer.name = "a\nb"; }),
              "the centre's answer has a name that is none");
    host_.startCentre([](fleet_test::TlsPeer& peer, const std::string&) { peer.answer(200, "?"); });
    host_.options.invitation = host_.invitation("web");
    EXPECT_NE(host_.refusal(), "");
    EXPECT_FALSE(isEnrolled());
}

TEST_F(EnrollingHost, SendsNothingThatItCouldNotFinish) {
    host_.options.invitation = host_.invitation();
    const fleet::EnrolOptions good = host_.options;
    host_.options.machineFile = host_.scratch.path("none");
    EXPECT_NE(host_.refusal().find("holds no identity of this machine"), std::string::npos);
    host_.options = good;
    host_.options.configuration = host_.scratch.path("none/zavlink.toml");
    EXPECT_EQ(host_.refusal(), host_.scratch.path("none") + ": No such file or directory");
    host_.options = good;
    host_.options.directory = host_.scratch.path("none/link");
    EXPECT_EQ(host_.refusal(), host_.scratch.path("none/link") + ": No such file or directory");
    host_.options = good;
    host_.scratch.write("link/joining.json", "{}", 0600);
    EXPECT_NE(host_.refusal().find("remove the file to begin anew"), std::string::npos);
    host_.options.invitation = "nonsense";
    EXPECT_NE(host_.refusal(), "");
}

TEST_F(EnrollingHost, LeavesTheDirectoryOfALinkThatRunsAlone) {
    LinkFile::create(host_.options.directory, KeyPair::make(KeyKind::User),
                     KeyPair::make(KeyKind::User), "token");
    const LinkFile running(host_.options.directory);
    host_.options.invitation = host_.invitation();
    EXPECT_EQ(host_.refusal(), host_.options.directory + " is in use by another zavlink");
}

}  // namespace
