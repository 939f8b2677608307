#include "fleet/server/keys/trust/host_enrolment.h"

#include <gtest/gtest.h>

#include <set>
#include <string>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/invitation.h"
#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/trust/join_refused.h"
#include "tests/fleet/server/keys/trust/joining.h"

namespace {

using fleet::EnrolmentAnswer;
using fleet::JoinRefused;
using joining::kDay;
using joining::kNow;
using joining::Machine;
using joining::wordsOf;

class JoiningHost : public testing::Test {
protected:
    joining::Fleet fleet_;
    const Machine machine_;
};

TEST_F(JoiningHost, IsToldAllThatItNeedsAndIsPutDown) {
    const EnrolmentAnswer answer = fleet_.redeem(machine_.request(fleet_.invite("web1")));
    const fleet::FleetFacts facts = fleet_.made.directory().facts();
    EXPECT_EQ(answer.name, "web1");
    EXPECT_EQ(answer.busUrls, facts.busUrls);
    EXPECT_EQ(answer.serverName, "localhost");
    EXPECT_EQ(answer.authority, fleet_.made.directory().authority());
    ASSERT_EQ(answer.centres.size(), 1U);
    EXPECT_EQ(fleet::readCertificate(answer.centres[0], facts.root, "demo").key,
              fleet_.made.directory().centre().key.publicKey());
    EXPECT_TRUE(fleet::isTokenSignedBy(answer.userToken, facts.accounts.hostSigner));
    ASSERT_EQ(fleet_.hosts.hosts.size(), 1U);
    const fleet::EnrolledHost& host = fleet_.hosts.hosts.front();
    EXPECT_EQ(host.host, machine_.bus.publicKey());
    EXPECT_EQ(host.signing, machine_.signing.publicKey());
    EXPECT_EQ(host.machine, "machine");
    EXPECT_EQ(host.name, "web1");
    EXPECT_EQ(host.labels, (fleet::Labels{{"env", "test"}}));
    EXPECT_EQ(host.joined, kNow);
}

TEST_F(JoiningHost, MayRepeatItsRequestWhenTheAnswerWasLost) {
    const std::string request = machine_.request(fleet_.invite("web1"));
    const EnrolmentAnswer first = fleet_.redeem(request);
    const EnrolmentAnswer again = fleet_.redeem(request, kNow + kDay);  // the invitation is over
    EXPECT_EQ(fleet::enrolmentAnswerText(again), fleet::enrolmentAnswerText(first));
}

TEST_F(JoiningHost, GetsNoAnswerBeforeTheRegisterHasIt) {
    const std::string request = machine_.request(fleet_.invite("web1"));
    fleet_.hosts.isBroken = true;
    EXPECT_EQ(wordsOf([&] { fleet_.redeem(request); }), "the register is broken");
    fleet_.hosts.isBroken = false;
    EXPECT_EQ(fleet_.redeem(request).name, "web1");
    EXPECT_EQ(fleet_.hosts.hosts.size(), 1U);
}

TEST_F(JoiningHost, UsesItsInvitationOnce) {
    const std::string token = fleet_.invite("web1");
    fleet_.redeem(machine_.request(token));
    Machine other;
    EXPECT_THROW(fleet_.redeem(other.request(token)), JoinRefused);
    // Not even one of the keys or the machine may be another one.
    other = machine_;
    other.signing = fleet::KeyPair::make(fleet::KeyKind::User);
    EXPECT_THROW(fleet_.redeem(other.request(token)), JoinRefused);
    other = machine_;
    other.id = "another machine";
    EXPECT_THROW(fleet_.redeem(other.request(token)), JoinRefused);
    EXPECT_EQ(fleet_.hosts.hosts.size(), 1U);
}

TEST_F(JoiningHost, LearnsNothingFromARefusal) {
    const std::string used = fleet_.invite("web1");
    fleet_.redeem(Machine().request(used));
    const std::string withdrawn = fleet_.invite("web2");
    const std::string token = fleet_.invite("web2");
    const std::set<std::string> words = {
        wordsOf([&] { fleet_.redeem(machine_.request(used)); }),
        wordsOf([&] { fleet_.redeem(machine_.request(withdrawn)); }),
        wordsOf([&] { fleet_.redeem(machine_.request(fleet::makeJoinToken())); }),
        wordsOf([&] { fleet_.redeem(machine_.request("no token at all")); }),
        wordsOf([&] { fleet_.redeem(machine_.request(token, "another fleet")); }),
        wordsOf([&] { fleet_.redeem(machine_.request(token), kNow + std::chrono::hours(1)); })};
    EXPECT_EQ(words, std::set<std::string>{JoinRefused().what()});
    EXPECT_EQ(fleet_.hosts.hosts.size(), 1U);
    EXPECT_EQ(fleet_.redeem(machine_.request(token), kNow + std::chrono::minutes(59)).name, "web2");
}

TEST_F(JoiningHost, MustBringKeysThatTheFleetHasNeverSeen) {
    fleet_.redeem(machine_.request(fleet_.invite("web1")));
    Machine swapped;
    swapped.bus = machine_.signing;
    swapped.signing = machine_.bus;
    Machine sharing;
    sharing.signing = machine_.signing;
    const std::string token = fleet_.invite("web2");
    for (const Machine& machine : {machine_, swapped, sharing})
        EXPECT_THROW(fleet_.redeem(machine.request(token)), JoinRefused);
    const fleet::KeyPair anna = fleet::KeyPair::make(fleet::KeyKind::User);
    fleet_.login(joining::loginOf(
        anna,
        fleet_.operators.invite({"anna", fleet::Role::Viewer, {}, {}, "*", kDay}, kDay, kNow)));
    sharing.signing = anna;
    EXPECT_THROW(fleet_.redeem(sharing.request(token)), JoinRefused);
    EXPECT_NO_THROW(fleet_.redeem(Machine().request(token)));
}

TEST_F(JoiningHost, DoesNotComeBackWithARevokedKey) {
    const std::string request = machine_.request(fleet_.invite("web1"));
    fleet_.redeem(request);
    fleet_.revoked.revokeHost("web1", kNow);
    EXPECT_THROW(fleet_.redeem(request), JoinRefused);
    EXPECT_THROW(fleet_.redeem(machine_.request(fleet_.invite("web1"))), JoinRefused);
}

TEST_F(JoiningHost, TakesNobodysNameUnlessItIsToReplaceThatHost) {
    fleet_.redeem(machine_.request(fleet_.invite("web1")));
    EXPECT_NE(wordsOf([&] { fleet_.invite("web1"); }).find("there is a host \"web1\" already"),
              std::string::npos);
    const std::string token = fleet_.invite("web1", true);
    EXPECT_FALSE(fleet_.revoked.isRevoked(machine_.bus.publicKey()));  // nobody has come yet
    const Machine next;
    fleet_.redeem(next.request(token));
    EXPECT_TRUE(fleet_.revoked.isRevoked(machine_.bus.publicKey()));
    EXPECT_FALSE(fleet_.revoked.isRevoked(next.bus.publicKey()));
    fleet_.redeem(next.request(token));  // again, after a lost answer
    EXPECT_FALSE(fleet_.revoked.isRevoked(next.bus.publicKey()));
    EXPECT_EQ(fleet_.revoked.all().size(), 1U);
}

TEST_F(JoiningHost, IsInvitedByANameAndForAReasonableTime) {
    for (const std::string& name : {std::string(), std::string("a b"), std::string("*"),
                                    std::string(65, 'a'), machine_.bus.publicKey()}) {
        EXPECT_THROW(fleet_.invite(name), fleet::KeysError) << name;
    }
    for (const auto valid : {std::chrono::hours(0), std::chrono::hours(24 * 31)}) {
        EXPECT_THROW(fleet_.enrolment.invite({"web1", {}, false, valid}, kNow), fleet::KeysError);
    }
}

TEST_F(JoiningHost, IsRefusedBeforeAnythingWhenTheBytesAreNone) {
    EXPECT_THROW(fleet_.redeem("nonsense"), fleet::MessageError);
    EXPECT_THROW(fleet_.redeem(""), fleet::MessageError);
}

TEST_F(JoiningHost, IsToldOfAgainAtTheCentresStartUnlessItIsRevoked) {
    const Machine other;
    fleet_.redeem(machine_.request(fleet_.invite("web1")));
    fleet_.redeem(other.request(fleet_.invite("web2")));
    fleet_.invite("web3");
    fleet_.revoked.revokeHost("web1", kNow);
    joining::Register restored;
    fleet_.enrolment.tell(restored);
    ASSERT_EQ(restored.hosts.size(), 1U);
    EXPECT_EQ(restored.hosts[0].host, other.bus.publicKey());
    EXPECT_EQ(restored.hosts[0].labels, (fleet::Labels{{"env", "test"}}));
}

TEST_F(JoiningHost, IsForgottenAMonthAfterAnInvitationThatNobodyUsed) {
    fleet_.invite("web1");
    const auto rows = [&] {
        return fleet_.trust.connection().number("SELECT count(*) FROM hosts");
    };
    fleet_.enrolment.invite({"web2", {}, false, std::chrono::hours(1)}, kNow + 30 * kDay);
    EXPECT_EQ(rows(), 2);
    fleet_.enrolment.invite({"web3", {}, false, std::chrono::hours(1)}, kNow + 31 * kDay);
    EXPECT_EQ(rows(), 2);
}

}  // namespace
