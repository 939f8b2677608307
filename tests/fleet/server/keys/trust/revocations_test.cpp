#include "fleet/server/keys/trust/revocations.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/trust/account_tokens.h"
#include "tests/fleet/server/keys/trust/joining.h"

namespace {

using fleet::KeyKind;
using fleet::KeyPair;
using fleet::Revocations;
using fleet::Role;
using joining::kDay;
using joining::kNow;
using joining::Machine;
using Keys = std::vector<std::string>;

class Revoking : public testing::Test {
protected:
    /// An operator with a certified key.
    KeyPair certified(const std::string& name) {
        const KeyPair key = KeyPair::make(KeyKind::User);
        fleet_.login(joining::loginOf(
            key,
            fleet_.operators.invite({name, Role::Viewer, {}, {}, "*", 10 * kDay}, kDay, kNow)));
        fleet_.operators.certify({key.publicKey()}, fleet_.made.root(), kNow);
        return key;
    }
    Machine enrolled(const std::string& name) {
        const Machine machine;
        fleet_.redeem(machine.request(fleet_.invite(name)));
        return machine;
    }

    joining::Fleet fleet_;
};

TEST_F(Revoking, AnOperatorEndsAllOfTheirKeysAndNobodyElses) {
    const KeyPair first = certified("anna");
    const KeyPair second = certified("anna");
    const KeyPair other = certified("bert");
    EXPECT_EQ(fleet_.revoked.revokeOperator("anna", kNow),
              (Keys{first.publicKey(), second.publicKey()}));
    EXPECT_EQ(fleet_.revoked.operators(kNow), (Keys{first.publicKey(), second.publicKey()}));
    EXPECT_FALSE(fleet_.revoked.isRevoked(other.publicKey()));
    EXPECT_TRUE(fleet_.revoked.hosts().empty());
}

TEST_F(Revoking, TwiceIsTheSameAsOnce) {
    const KeyPair key = certified("anna");
    fleet_.revoked.revokeOperator("anna", kNow);
    EXPECT_TRUE(fleet_.revoked.revokeOperator("anna", kNow + kDay).empty());
    EXPECT_TRUE(fleet_.revoked.revokeOperator(key.publicKey(), kNow + kDay).empty());
    ASSERT_EQ(fleet_.revoked.all().size(), 1U);
    EXPECT_EQ(fleet_.revoked.all()[0].since, kNow);
}

TEST_F(Revoking, AKeyThatIsNotKnownCounts) {
    const std::string key = KeyPair::make(KeyKind::User).publicKey();
    EXPECT_EQ(fleet_.revoked.revokeOperator(key, kNow), Keys{key});
    EXPECT_EQ(fleet_.revoked.operators(kNow + 5000 * kDay), Keys{key});  // who knows when it ends
    const std::string host = KeyPair::make(KeyKind::User).publicKey();
    EXPECT_EQ(fleet_.revoked.revokeHost(host, kNow), Keys{host});
    EXPECT_EQ(fleet_.revoked.hosts(), (Revocations{{host, fleet::kForEver}}));
}

TEST_F(Revoking, AHostByItsSigningKeyIsTheSame) {
    const Machine machine = enrolled("web1");
    EXPECT_EQ(fleet_.revoked.revokeHost(machine.signing.publicKey(), kNow),
              Keys{machine.bus.publicKey()});
}

TEST_F(Revoking, AKeyInTheWrongListIsAnErrorThatChangesNothing) {
    const KeyPair anna = certified("anna");
    const Machine machine = enrolled("web1");
    EXPECT_THROW(fleet_.revoked.revokeHost(anna.publicKey(), kNow), fleet::KeysError);
    EXPECT_THROW(fleet_.revoked.revokeOperator(machine.bus.publicKey(), kNow), fleet::KeysError);
    EXPECT_THROW(fleet_.revoked.revokeOperator(machine.signing.publicKey(), kNow),
                 fleet::KeysError);
    EXPECT_EQ(fleet_.revoked.count(), 0);
    const std::string unknown = KeyPair::make(KeyKind::User).publicKey();
    fleet_.revoked.revokeHost(unknown, kNow);
    EXPECT_THROW(fleet_.revoked.revokeOperator(unknown, kNow), fleet::KeysError);
}

TEST_F(Revoking, ANameThatIsNotKnownIsAnErrorThatChangesNothing) {
    certified("anna");
    enrolled("web1");
    EXPECT_THROW(fleet_.revoked.revokeOperator("web1", kNow), fleet::KeysError);
    EXPECT_THROW(fleet_.revoked.revokeHost("anna", kNow), fleet::KeysError);
    EXPECT_EQ(fleet_.revoked.count(), 0);
}

TEST_F(Revoking, AHostHasTheBusRefuseItsKeyForEver) {
    const Machine machine = enrolled("web1");
    enrolled("web2");
    EXPECT_EQ(fleet_.revoked.revokeHost("web1", kNow), Keys{machine.bus.publicKey()});
    EXPECT_EQ(fleet_.revoked.hosts(), (Revocations{{machine.bus.publicKey(), fleet::kForEver}}));
    EXPECT_TRUE(fleet_.revoked.operators(kNow).empty());
}

TEST_F(Revoking, AHostThatIsOnlyInvitedTakesTheInvitationBack) {
    const std::string token = fleet_.invite("web1");
    EXPECT_TRUE(fleet_.revoked.revokeHost("web1", kNow).empty());
    EXPECT_NE(joining::wordsOf([&] { fleet_.redeem(Machine().request(token)); }), "");
}

TEST_F(Revoking, IsToldToLinksUntilLongAfterTheCertificateEnded) {
    const KeyPair key = certified("anna");
    fleet_.revoked.revokeOperator("anna", kNow);
    EXPECT_EQ(fleet_.revoked.operators(kNow + 39 * kDay), Keys{key.publicKey()});
    EXPECT_TRUE(fleet_.revoked.operators(kNow + 40 * kDay).empty());
    EXPECT_TRUE(fleet_.revoked.isRevoked(key.publicKey()));
}

TEST_F(Revoking, ListsTheLatestFirstWithTheirNames) {
    const KeyPair key = certified("anna");
    const Machine machine = enrolled("web1");
    fleet_.revoked.revokeOperator("anna", kNow);
    fleet_.revoked.revokeHost("web1", kNow + kDay);
    const auto all = fleet_.revoked.all();
    ASSERT_EQ(all.size(), 2U);
    EXPECT_EQ(all[0].name, "web1");
    EXPECT_EQ(all[0].kind, fleet::RevokedKey::Kind::Host);
    EXPECT_EQ(all[0].key, machine.bus.publicKey());
    EXPECT_EQ(all[0].since, kNow + kDay);
    EXPECT_EQ(all[1].name, "anna");
    EXPECT_EQ(all[1].kind, fleet::RevokedKey::Kind::Operator);
}

TEST_F(Revoking, IsSeenByAProcessThatRunsMeanwhile) {
    fleet::TrustDatabase running(fleet_.made.directory().trustDatabase());
    const fleet::RevokedKeys seen(running.connection());
    const std::int64_t before = seen.count();
    enrolled("web1");
    EXPECT_EQ(seen.count(), before);
    fleet_.revoked.revokeHost("web1", kNow);
    EXPECT_GT(seen.count(), before);
    EXPECT_EQ(seen.hosts().size(), 1U);
}

TEST_F(Revoking, HasTheAccountsRefuseThoseKeys) {
    const fleet::BusKeys bus = fleet_.made.directory().bus();
    const auto tokens = accountTokens(fleet_.made.directory().facts(), bus, fleet_.revoked.hosts(),
                                      fleet::TokenTime(1));
    ASSERT_EQ(tokens.size(), 3U);
    for (const std::string& token : tokens)
        EXPECT_TRUE(fleet::isTokenSignedBy(token, bus.accountSigner.publicKey()));
}

}  // namespace
