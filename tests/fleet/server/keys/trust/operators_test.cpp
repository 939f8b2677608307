#include "fleet/server/keys/trust/operators.h"

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

using fleet::JoinRefused;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::OperatorGrant;
using fleet::OperatorKey;
using fleet::Role;
using joining::kDay;
using joining::kNow;
using joining::loginOf;
using joining::wordsOf;

const OperatorGrant kAnna{"anna", Role::Operator, {"START", "STOP"}, {"ux"}, "env=test", 10 * kDay};

class JoiningOperator : public testing::Test {
protected:
    std::string invite(const OperatorGrant& grant = kAnna) {
        return fleet_.operators.invite(grant, kDay, kNow);
    }
    void certify(const KeyPair& key, fleet::Moment now = kNow) {
        fleet_.operators.certify({key.publicKey()}, fleet_.made.root(), now);
    }
    fleet::Certificate certificateIn(const fleet::LoginAnswer& answer) const {
        return fleet::readCertificate(answer.certificate.value(),
                                      fleet_.made.directory().facts().root, "demo");
    }
    OperatorKey::State state() const { return fleet_.operators.all().back().state; }

    joining::Fleet fleet_;
    const KeyPair key_ = KeyPair::make(KeyKind::User);
};

TEST_F(JoiningOperator, WaitsForTheRootAndThenHasWhatWasGranted) {
    const std::string request = loginOf(key_, invite());
    EXPECT_EQ(state(), OperatorKey::State::Invited);
    EXPECT_EQ(fleet_.login(request).certificate, std::nullopt);
    EXPECT_EQ(fleet_.login(request).certificate, std::nullopt);  // it asks again and again
    EXPECT_EQ(state(), OperatorKey::State::Waiting);
    ASSERT_EQ(fleet_.operators.waiting().size(), 1U);
    EXPECT_EQ(fleet_.operators.waiting()[0].key, key_.publicKey());
    certify(key_, kNow + kDay);
    EXPECT_TRUE(fleet_.operators.waiting().empty());
    const auto answer = fleet_.login(request, kNow + 3 * kDay);  // the invitation is over
    EXPECT_EQ(answer.centres, fleet_.made.directory().facts().centres);
    const fleet::Certificate certificate = certificateIn(answer);
    EXPECT_EQ(certificate.holder, fleet::Certificate::Holder::Operator);
    EXPECT_EQ(certificate.name, "anna");
    EXPECT_EQ(certificate.key, key_.publicKey());
    EXPECT_EQ(certificate.until, kNow + 11 * kDay);
    EXPECT_EQ(certificate.selector, "env=test");
    EXPECT_TRUE(fleet::allows(certificate, "START", "ux"));
    EXPECT_FALSE(fleet::allows(certificate, "INSTALL", "ux"));
    EXPECT_FALSE(fleet::allows(certificate, "START", "um"));
}

TEST_F(JoiningOperator, OfEachRoleIsCertifiedForWhatItMay) {
    const auto certified = [&](const OperatorGrant& grant) {
        const KeyPair key = KeyPair::make(KeyKind::User);
        const std::string request = loginOf(key, invite(grant));
        fleet_.login(request);
        certify(key);
        return certificateIn(fleet_.login(request));
    };
    const auto viewer = certified({"vera", Role::Viewer, {}, {}, "env=test", kDay});
    EXPECT_FALSE(fleet::allows(viewer, "START", "ux"));
    EXPECT_FALSE(fleet::allows(viewer, "CANCEL", ""));
    EXPECT_EQ(viewer.selector, "env=test");
    const auto admin = certified({"ada", Role::Admin, {}, {}, "*", kDay});
    EXPECT_TRUE(fleet::allows(admin, "START", "ux"));
    EXPECT_TRUE(fleet::allows(admin, "CANCEL", ""));
}

TEST_F(JoiningOperator, UsesAnInvitationForOneKey) {
    const std::string token = invite();
    fleet_.login(loginOf(key_, token));
    EXPECT_THROW(fleet_.login(loginOf(KeyPair::make(KeyKind::User), token)), JoinRefused);
    EXPECT_THROW(fleet_.login(loginOf(key_, invite())), JoinRefused);  // the key is known
}

TEST_F(JoiningOperator, LearnsNothingFromARefusal) {
    const std::string withdrawn = invite();
    const std::string token = invite();
    const std::set<std::string> words = {
        wordsOf([&] { fleet_.login(loginOf(key_, withdrawn)); }),
        wordsOf([&] { fleet_.login(loginOf(key_, fleet::makeJoinToken())); }),
        wordsOf([&] { fleet_.login(loginOf(key_, "")); }),
        wordsOf([&] { fleet_.login(loginOf(key_, token, "another fleet")); }),
        wordsOf([&] { fleet_.login(loginOf(key_, token), kNow + kDay); })};
    EXPECT_EQ(words, std::set<std::string>{JoinRefused().what()});
    EXPECT_TRUE(fleet_.operators.waiting().empty());
    EXPECT_THROW(fleet_.login("nonsense"), fleet::MessageError);
}

TEST_F(JoiningOperator, BringsNoKeyOfAHost) {
    const joining::Machine machine;
    fleet_.redeem(machine.request(fleet_.invite("web1")));
    const std::string token = invite();
    EXPECT_THROW(fleet_.login(loginOf(machine.bus, token)), JoinRefused);
    EXPECT_THROW(fleet_.login(loginOf(machine.signing, token)), JoinRefused);
}

TEST_F(JoiningOperator, IsNotCertifiedAfterARevocation) {
    const std::string request = loginOf(key_, invite());
    fleet_.login(request);
    fleet_.revoked.revokeOperator("anna", kNow);
    EXPECT_EQ(state(), OperatorKey::State::Revoked);
    EXPECT_TRUE(fleet_.operators.waiting().empty());
    EXPECT_THROW(certify(key_), fleet::KeysError);
    EXPECT_THROW(fleet_.login(request), JoinRefused);
    EXPECT_THROW(fleet_.login(loginOf(key_, invite())), JoinRefused);
}

TEST_F(JoiningOperator, IsNotLetInByAnInvitationThatARevocationWithdrew) {
    const std::string token = invite();
    EXPECT_TRUE(fleet_.revoked.revokeOperator("anna", kNow).empty());
    EXPECT_EQ(state(), OperatorKey::State::Withdrawn);
    EXPECT_THROW(fleet_.login(loginOf(key_, token)), JoinRefused);
}

TEST_F(JoiningOperator, IsCertifiedWithAllOthersOrNobodyIs) {
    fleet_.login(loginOf(key_, invite()));
    const std::string stranger = KeyPair::make(KeyKind::User).publicKey();
    const std::string words = wordsOf([&] {
        fleet_.operators.certify({key_.publicKey(), stranger}, fleet_.made.root(), kNow);
    });
    EXPECT_NE(words.find(stranger), std::string::npos);
    EXPECT_EQ(state(), OperatorKey::State::Waiting);
    certify(key_);
    EXPECT_THROW(certify(key_), fleet::KeysError);
}

TEST_F(JoiningOperator, MayHaveASecondKey) {
    const KeyPair laptop = KeyPair::make(KeyKind::User);
    fleet_.login(loginOf(key_, invite()));
    fleet_.login(loginOf(laptop, invite()));
    certify(key_);
    certify(laptop);
    EXPECT_TRUE(fleet_.operators.grantOf(key_.publicKey(), kNow).has_value());
    EXPECT_TRUE(fleet_.operators.grantOf(laptop.publicKey(), kNow).has_value());
    fleet_.revoked.revokeOperator(laptop.publicKey(), kNow);
    EXPECT_TRUE(fleet_.operators.grantOf(key_.publicKey(), kNow).has_value());
    EXPECT_FALSE(fleet_.operators.grantOf(laptop.publicKey(), kNow).has_value());
}

TEST_F(JoiningOperator, MayNothingAtTheCentreBeforeAndAfterItsCertificate) {
    const auto grant = [&](fleet::Moment now) {
        return fleet_.operators.grantOf(key_.publicKey(), now);
    };
    EXPECT_FALSE(grant(kNow).has_value());
    fleet_.login(loginOf(key_, invite()));
    EXPECT_FALSE(grant(kNow).has_value());
    certify(key_);
    ASSERT_TRUE(grant(kNow).has_value());
    EXPECT_EQ(grant(kNow)->role, Role::Operator);
    EXPECT_EQ(grant(kNow)->name, "anna");
    EXPECT_TRUE(grant(kNow + 10 * kDay - fleet::Moment(1)).has_value());
    EXPECT_FALSE(grant(kNow + 10 * kDay).has_value());
}

TEST(OperatorsGrant, MakesSense) {
    const auto refusal = [](const OperatorGrant& grant) {
        return wordsOf([&] { fleet::completed(grant); });
    };
    EXPECT_EQ(refusal(kAnna), "");
    EXPECT_NE(refusal({"a b", Role::Viewer, {}, {}, "*", kDay}), "");
    EXPECT_NE(refusal({"anna", Role::Viewer, {"START"}, {}, "*", kDay}), "");
    EXPECT_NE(refusal({"anna", Role::Admin, {}, {"ux"}, "*", kDay}), "");
    EXPECT_NE(refusal({"anna", Role::Operator, {}, {"ux"}, "*", kDay}), "");
    EXPECT_NE(refusal({"anna", Role::Viewer, {}, {}, "", kDay}), "");
    EXPECT_NE(refusal({"anna", Role::Viewer, {}, {}, "env==", kDay}), "");
    EXPECT_NE(refusal({"anna", Role::Viewer, {}, {}, "*", std::chrono::minutes(1)}), "");
    EXPECT_NE(refusal({"anna", Role::Viewer, {}, {}, "*", 4 * 365 * kDay}), "");
    EXPECT_EQ(fleet::completed({"ada", Role::Admin, {}, {}, "*", kDay}).commands,
              std::vector<std::string>{"*"});
}

TEST(OperatorsRole, HasAName) {
    for (const Role role : {Role::Viewer, Role::Operator, Role::Admin})
        EXPECT_EQ(fleet::roleOf(fleet::textOf(role)), role);
    EXPECT_THROW(fleet::roleOf("root"), fleet::KeysError);
}

}  // namespace
