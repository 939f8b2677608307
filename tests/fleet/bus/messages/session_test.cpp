#include "fleet/bus/messages/session.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/trust/signed.h"

namespace {

using fleet::KeyKind;
using fleet::KeyPair;
using fleet::MessageError;
using fleet::readSessionRequest;
using fleet::SessionRequest;
using fleet::signSessionRequest;

class Session : public testing::Test {
protected:
    const KeyPair key_ = KeyPair::make(KeyKind::User);
    const SessionRequest request_{"demo", key_.publicKey(), "https://centre.example:8443",
                                  fleet::Moment{1'700'000'000'000}, fleet::makeSessionNonce()};
};

TEST_F(Session, RequestTellsWhoAsksWhomAndWhen) {
    const SessionRequest read = readSessionRequest(signSessionRequest(request_, key_));
    EXPECT_EQ(read.fleet, "demo");
    EXPECT_EQ(read.key, key_.publicKey());
    EXPECT_EQ(read.url, "https://centre.example:8443");
    EXPECT_EQ(read.time, request_.time);
    EXPECT_EQ(read.nonce, request_.nonce);
}

TEST_F(Session, RequestIsSignedByItsKeyForThisPurpose) {
    const std::string bytes = signSessionRequest(request_, key_);
    const std::string text(fleet::partsOf(bytes)->text);
    EXPECT_THROW(readSessionRequest(signMessage(fleet::Purpose::LoggingIn, key_, text)),
                 MessageError);
    const KeyPair other = KeyPair::make(KeyKind::User);
    EXPECT_THROW(readSessionRequest(signMessage(fleet::Purpose::OpeningSession, other, text)),
                 MessageError);
    EXPECT_THROW(readSessionRequest(signMessage(fleet::Purpose::OpeningSession, key_, text, "x")),
                 MessageError);
    EXPECT_THROW(signSessionRequest(request_, other), std::invalid_argument);
}

TEST_F(Session, RequestIsNoneWhenAnyByteIsAnotherOneOrMissing) {
    const std::string bytes = signSessionRequest(request_, key_);
    for (std::size_t i = 0; i < bytes.size(); ++i) {
        std::string changed = bytes;
        changed[i] = static_cast<char>(changed[i] ^ 1);
        EXPECT_THROW(readSessionRequest(changed), MessageError) << i;
        EXPECT_THROW(readSessionRequest(bytes.substr(0, i)), MessageError) << i;
    }
}

TEST_F(Session, NonceHas32DigitsAndIsAnotherOneEachTime) {
    EXPECT_EQ(request_.nonce.size(), 32U);
    EXPECT_NE(fleet::makeSessionNonce(), request_.nonce);
    SessionRequest odd = request_;
    odd.nonce = "short";
    EXPECT_THROW(readSessionRequest(signSessionRequest(odd, key_)), MessageError);
}

}  // namespace
