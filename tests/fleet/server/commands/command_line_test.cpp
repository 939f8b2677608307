#include "fleet/server/commands/command_line.h"

#include <gtest/gtest.h>

#include <sstream>
#include <string>
#include <vector>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/invitation.h"
#include "fleet/server/keys/files/private_file.h"
#include "fleet/server/keys/tls/certificate_authority.h"
#include "tests/fleet/server/keys/trust/joining.h"

namespace {

using fleet::KeyKind;
using fleet::KeyPair;
using fleet::Moment;
using joining::kDay;
using joining::kNow;
using Words = std::vector<std::string>;

struct Said {
    int status = -1;
    std::string out;
    std::string err;
};

bool holds(const std::string& text, const std::string& part) {
    return text.find(part) != std::string::npos;
}

class ZavfleetdCommandLine : public testing::Test {
protected:
    Said run(Words words, Moment now = kNow) const {
        words.insert(words.begin(), {"--directory", scratch_.path("keys")});
        std::ostringstream out;
        std::ostringstream err;
        const int status = fleet::runCommandLine(words, now, out, err);
        return {status, out.str(), err.str()};
    }
    Said init() const {
        return run({"keys", "init", "--fleet", "demo", "--root", root(), "--name",
                    "localhost,127.0.0.1", "--store-bytes", "1000000"});
    }
    std::string root() const { return scratch_.path("root.key"); }
    Said addAnna() const {
        return run({"operator", "add", "anna", "--role", "operator", "--commands", "START,STOP",
                    "--products", "ux", "--on", "env=test"});
    }
    /// The key that a login with that line brings.
    KeyPair login(const std::string& line) const {
        const KeyPair key = KeyPair::make(KeyKind::User);
        const fleet::FleetDirectory directory(scratch_.path("keys"));
        fleet::TrustDatabase trust(directory.trustDatabase());
        fleet::Operators(trust.connection())
            .login(joining::loginOf(key, fleet::readInvitation(line).token), directory.facts(),
                   kNow);
        return key;
    }

    const ScratchDir scratch_;
};

TEST_F(ZavfleetdCommandLine, MakesAFleetOnce) {
    const Said made = init();
    EXPECT_EQ(made.status, 0) << made.err;
    EXPECT_EQ(made.out, "");
    EXPECT_TRUE(holds(made.err, root()));
    EXPECT_TRUE(holds(scratch_.read("keys/bus/nats-server.conf"), "max_file_store: 1000000"));
    const Said again = init();
    EXPECT_EQ(again.status, 1);
    EXPECT_TRUE(holds(again.err, "is there already"));
}

TEST_F(ZavfleetdCommandLine, PrintsOneLineForANewHost) {
    init();
    const Said said = run({"enrol", "web1", "--labels", "env=test", "--valid", "30m"});
    EXPECT_EQ(said.status, 0) << said.err;
    EXPECT_EQ(said.err, "");
    EXPECT_EQ(said.out.find('\n'), said.out.size() - 1);
    const fleet::Invitation invitation = fleet::readInvitation(said.out);
    EXPECT_EQ(invitation.url, "https://localhost:8443");
    EXPECT_EQ(invitation.fleet, "demo");
    EXPECT_EQ(invitation.authority, fleet::fingerprintOfCertificate(scratch_.read("keys/ca.pem")));
    const fleet::FleetDirectory directory(scratch_.path("keys"));
    fleet::TrustDatabase trust(directory.trustDatabase());
    joining::Register hosts;
    fleet::HostEnrolment(trust.connection())
        .redeem(joining::Machine().request(invitation.token), directory, hosts,
                kNow + std::chrono::minutes(29));
    ASSERT_EQ(hosts.hosts.size(), 1U);
    EXPECT_EQ(hosts.hosts[0].name, "web1");
    EXPECT_EQ(hosts.hosts[0].labels, (fleet::Labels{{"env", "test"}}));
    EXPECT_TRUE(holds(run({"enrol", "web1"}).err, "there is a host"));
    EXPECT_EQ(run({"enrol", "web1", "--replace"}).status, 0);
}

TEST_F(ZavfleetdCommandLine, CertifiesAnOperatorWhoseKeyIsNamed) {
    init();
    const KeyPair key = login(addAnna().out);
    const std::string waiting = run({"operator", "ls", "--waiting"}).out;
    EXPECT_EQ(waiting, "anna  " + key.publicKey() +
                           "  operator  commands START,STOP  products ux  on env=test  waits\n");
    const Said unnamed = run({"operator", "certify", "--root", root()});
    EXPECT_EQ(unnamed.status, 1);
    EXPECT_TRUE(holds(unnamed.err, "name the keys"));
    const Said certified = run({"operator", "certify", "--root", root(), key.publicKey()});
    EXPECT_EQ(certified.status, 0) << certified.err;
    EXPECT_TRUE(holds(certified.out, "certified until 2027-"));
    EXPECT_EQ(run({"operator", "ls", "--waiting"}).out, "");
    EXPECT_EQ(run({"operator", "ls"}).out, certified.out);
}

TEST_F(ZavfleetdCommandLine, CertifiesAllThatWaitWhenItIsToldTo) {
    init();
    const KeyPair anna = login(addAnna().out);
    const KeyPair vera = login(run({"operator", "add", "vera", "--role", "viewer"}).out);
    const Said said = run({"operator", "certify", "--root", root(), "--all"});
    EXPECT_TRUE(holds(said.out, anna.publicKey()));
    EXPECT_TRUE(holds(said.out, vera.publicKey()));
    EXPECT_TRUE(holds(run({"operator", "certify", "--root", root(), "--all"}).err, "No key waits"));
    EXPECT_EQ(run({"operator", "certify", "--root", root(), "--all", anna.publicKey()}).status, 1);
}

TEST_F(ZavfleetdCommandLine, CertifiesNobodyWithAnotherFleetsRoot) {
    init();
    const KeyPair key = login(addAnna().out);
    const made_fleet::MadeFleet other;
    const Said said = run({"operator", "certify", "--root", other.rootFile(), key.publicKey()});
    EXPECT_EQ(said.status, 1);
    EXPECT_TRUE(holds(said.err, "is not the one of the fleet"));
    EXPECT_TRUE(holds(run({"operator", "ls"}).out, "waits"));
}

TEST_F(ZavfleetdCommandLine, RefusesAnOperatorWithoutHosts) {
    init();
    const Said said = run({"operator", "add", "anna", "--role", "operator", "--commands", "START"});
    EXPECT_EQ(said.status, 1);
    EXPECT_TRUE(holds(said.err, "--on"));
    EXPECT_EQ(run({"operator", "ls"}).out, "");
}

TEST_F(ZavfleetdCommandLine, RevokesAndLists) {
    init();
    const KeyPair key = login(addAnna().out);
    run({"operator", "certify", "--root", root(), "--all"});
    EXPECT_EQ(run({"revoke", "operator", "anna"}).out, key.publicKey() + "\n");
    EXPECT_TRUE(
        holds(run({"revoke", "ls"}).out, "operator  anna  " + key.publicKey() + "  since "));
    EXPECT_TRUE(holds(run({"operator", "ls"}).out, "revoked"));
    EXPECT_EQ(run({"revoke", "host", "nobody"}).status, 1);
}

TEST_F(ZavfleetdCommandLine, TellsWhatEndsSoonAndRotates) {
    init();
    EXPECT_EQ(run({"doctor"}).status, 0);
    const Moment late = kNow + 710 * kDay;
    const Said said = run({"doctor"}, late);
    EXPECT_EQ(said.status, 1);
    EXPECT_TRUE(holds(said.out, "the certificate of the centre's key ends on "));
    EXPECT_TRUE(holds(said.out, "zavfleetd keys rotate"));
    EXPECT_EQ(run({"keys", "rotate", "--root", root()}, late).status, 0);
    EXPECT_EQ(run({"doctor"}, late).status, 0);
}

TEST_F(ZavfleetdCommandLine, SaysNoSecretEver) {
    std::string said;
    const auto keep = [&](const Said& now) { said += now.out + now.err; };
    keep(init());
    keep(run({"enrol", "web1"}));
    const Said added = addAnna();
    keep(added);
    login(added.out);
    keep(run({"operator", "certify", "--root", root(), "--all"}));
    const std::string before = scratch_.read("keys/bus.keys") + scratch_.read("keys/centre.key");
    keep(run({"keys", "rotate", "--root", root()}));
    keep(run({"operator", "ls"}));
    keep(run({"doctor"}));
    // A root that is cut off, and files in each other's places.
    const std::string whole = scratch_.read("root.key");
    scratch_.write("root.key", whole.substr(0, whole.size() / 2), 0600);
    keep(run({"keys", "rotate", "--root", root()}));
    keep(run({"keys", "rotate", "--root", scratch_.path("keys/bus.keys")}));
    std::istringstream words(before + whole + scratch_.read("keys/bus.keys") +
                             scratch_.read("keys/centre.key"));
    int secrets = 0;
    for (std::string word; words >> word;) {
        if (!KeyPair::ofSeed(word)) continue;
        ++secrets;
        EXPECT_FALSE(holds(said, word));
    }
    EXPECT_EQ(secrets, 4 + 1 + 7 + 4 + 1);
}

TEST_F(ZavfleetdCommandLine, TellsMisuseFromFailure) {
    for (const Words& words : {Words{}, Words{"keys"}, Words{"nothing"}, Words{"enrol"},
                               Words{"enrol", "web1", "--unknown"}, Words{"keys", "init"}}) {
        const Said said = run(words);
        EXPECT_EQ(said.status, 2);
        EXPECT_NE(said.err, "");
    }
    EXPECT_EQ(run({"--help"}).status, 0);
    const Said missing = run({"enrol", "web1"});
    EXPECT_EQ(missing.status, 1);
    EXPECT_TRUE(holds(missing.err, "zavfleetd: "));
    init();
    for (const char* const valid : {"", "1", "h", "1y", "-1h", "9999999h", "1h2m"})
        EXPECT_EQ(run({"enrol", "web1", "--valid", valid}).status, 1) << valid;
    EXPECT_EQ(run({"operator", "add", "anna", "--role", "king"}).status, 1);
}

}  // namespace
