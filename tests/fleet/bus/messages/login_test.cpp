#include "fleet/bus/messages/login.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/invitation.h"
#include "fleet/bus/trust/signed.h"

namespace {

using fleet::KeyKind;
using fleet::KeyPair;
using fleet::LoginAnswer;
using fleet::LoginRequest;
using fleet::MessageError;
using fleet::readLogin;
using fleet::signLogin;

class Login : public testing::Test {
protected:
    const KeyPair key_ = KeyPair::make(KeyKind::User);
    const LoginRequest request_{"demo", fleet::makeJoinToken(), key_.publicKey()};
};

TEST_F(Login, TellsTheCentreWhoseKeyIsToBeCertified) {
    const LoginRequest read = readLogin(signLogin(request_, key_));
    EXPECT_EQ(read.fleet, "demo");
    EXPECT_EQ(read.token, request_.token);
    EXPECT_EQ(read.key, key_.publicKey());
}

TEST_F(Login, IsSignedByItsKeyForThisPurpose) {
    const std::string bytes = signLogin(request_, key_);
    const std::string text(fleet::partsOf(bytes)->text);
    EXPECT_THROW(readLogin(signMessage(fleet::Purpose::Enrolling, key_, text)), MessageError);
    const KeyPair other = KeyPair::make(KeyKind::User);
    EXPECT_THROW(readLogin(signMessage(fleet::Purpose::LoggingIn, other, text)), MessageError);
    EXPECT_THROW(readLogin(signMessage(fleet::Purpose::LoggingIn, key_, text, "x")), MessageError);
    EXPECT_THROW(signLogin(request_, other), std::invalid_argument);
}

TEST_F(Login, IsNoneWhenAnyByteIsAnotherOneOrMissing) {
    const std::string bytes = signLogin(request_, key_);
    for (std::size_t i = 0; i < bytes.size(); ++i) {
        std::string changed = bytes;
        changed[i] = static_cast<char>(changed[i] ^ 1);
        EXPECT_THROW(readLogin(changed), MessageError) << i;
        EXPECT_THROW(readLogin(bytes.substr(0, i)), MessageError) << i;
    }
}

TEST_F(Login, AnswerHasACertificateOrNoneYet) {
    LoginAnswer sent;
    sent.centres = {"one", "two"};
    LoginAnswer read = fleet::readLoginAnswer(fleet::loginAnswerText(sent));
    EXPECT_EQ(read.certificate, std::nullopt);
    EXPECT_EQ(read.centres, sent.centres);
    sent.certificate = std::string("\0certificate", 12);
    read = fleet::readLoginAnswer(fleet::loginAnswerText(sent));
    EXPECT_EQ(read.certificate, sent.certificate);
    EXPECT_THROW(fleet::readLoginAnswer("[]"), MessageError);
}

}  // namespace
